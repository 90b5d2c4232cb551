/// Episodes, records and remote ports as rows of tables.
#ifndef SENSOR_VIEWS_INCLUDE_EPISODETEXT_H
#define SENSOR_VIEWS_INCLUDE_EPISODETEXT_H

#include <string>

#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/views/include/TextTable.h"

/// "LUNs 0-2,40; sense 6, ASC 29, ASCQ 00": what an episode holds beside its count and times, on one line.
std::string formatDetail(const ZTSEpisode& acrEpisode);

/// "0-2,40", "all", "all and 3"; empty: none.
std::string formatLuns(const ZTSLunSet& acrLuns);

/// The remote port's name, else its WWPN; "-" where the episode has none.
std::string describePort(const std::optional<ZTSRemotePort>& acrPort, const ZTCNameBook& acrNames);

/// A table with a row an episode: number, last event, state, count, kind, initiator, remote port, detail.
ZTCTextTable makeEpisodeTable(std::size_t aWidth);
void addRow(ZTCTextTable& arTable, const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames, ZTCHistoryTime aNow);

/// A table with a row a raw record.
ZTCTextTable makeRecordTable(std::size_t aWidth);
void addRow(ZTCTextTable& arTable, const ZTSStoredRecord& acrRecord, const ZTCNameBook& acrNames);

/// A table with a row a remote port.
ZTCTextTable makePortTable(std::size_t aWidth);
void addRow(ZTCTextTable& arTable, const ZTSPortSummary& acrPort, const ZTCNameBook& acrNames, ZTCHistoryTime aNow);

#endif
