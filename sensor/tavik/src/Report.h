/// What `tavik report` gathers.
#ifndef SENSOR_TAVIK_SRC_REPORT_H
#define SENSOR_TAVIK_SRC_REPORT_H

#include <array>
#include <string>
#include <vector>

#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/ReportArchive.h"

/// The kernel's files about Fibre Channel, a bounded number of them. A file that does not answer is left out and named.
std::vector<ZTSReportFile> gatherSysfs(std::vector<std::string>& arMissing);

/// Everything: settings, versions, status, history of 7 days, sysfs, ends of logs, and what could not be had. What must
/// not leave the host is left out.
std::vector<ZTSReportFile> gatherReport(const ZTCContext& acrContext, ZTCHistoryTime aNow);

#endif
