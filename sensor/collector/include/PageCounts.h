/// The agent's status page in the terms of the store.
#ifndef SENSOR_COLLECTOR_INCLUDE_PAGECOUNTS_H
#define SENSOR_COLLECTOR_INCLUDE_PAGECOUNTS_H

#include <vector>

#include "sensor/client/include/StatusPageReader.h"
#include "sensor/store/include/Store.h"

/// One row for each board and kind, and the row for unknown boards, those left out that have only zeros.
std::vector<ZTSPageCounts> toPageCounts(const ZTSStatusSnapshot& acrPage);

/// The state of each of the twenty kinds of each board.
std::vector<ZTSKindStateNow> toKindStates(const ZTSStatusSnapshot& acrPage);

/// The key of a row of a board: 0 for the row `other`.
ZTCKindKey getRowKind(std::size_t aRow);

/// Whether the agent holds nothing of this initiator and kind. True for initiators that are not on the page.
bool holdsNothing(const ZTSStatusSnapshot& acrPage, const ZTSInitiator& acrInitiator, ZTCKindKey aKind);

#endif
