/// Responses as aligned text for people.
#ifndef SENSOR_CLIENT_INCLUDE_RECORDTABLE_H
#define SENSOR_CLIENT_INCLUDE_RECORDTABLE_H

#include <string>

#include "sensor/client/include/Response.h"

/// One row a record under a heading, then a line of totals; every line ends with a line break. Control characters that
/// were received are escaped. @param aHasHeading  false: rows and totals only
std::string formatTable(const ZTSResponse& acrResponse, bool aHasHeading = true);

/// The details of one record's event data: "luns=3,9", "rejections=[0x09/0x2a*2 0x03/0x00]".
std::string formatDetails(const ZTSReceivedRecord& acrRecord);

/// The kind's name, or "unknown-C/S".
std::string formatKind(const ZTSReceivedRecord& acrRecord);

/// The remote port: the registered target's port name, else what the event data names, else "-".
std::string formatRemotePort(const ZTSReceivedRecord& acrRecord);

/// Control characters and bytes beyond ASCII as \xNN.
std::string escapeText(const std::string& acrText);

#endif
