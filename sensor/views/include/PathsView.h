/// `tavik paths`: each logical unit with its paths, as text and as JSON.
#ifndef SENSOR_VIEWS_INCLUDE_PATHSVIEW_H
#define SENSOR_VIEWS_INCLUDE_PATHSVIEW_H

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "sensor/views/include/FilterText.h"
#include "sensor/views/include/SanView.h"
#include "sensor/views/include/StatusView.h"

/// Which units: several values of one field mean or, several fields mean and, an empty field means all.
struct ZTSPathsFilter {
    std::vector<ZTSFcName> mPorts{};       ///< with a path through one of these remote ports
    std::vector<ZTSFcName> mInitiators{};  ///< and from one of these local ports
    std::vector<std::string> mLuns{};      ///< a number; a wwid; a name of the multipath device or a disk
    bool mIsTroubleOnly = false;           ///< with a path that does not run, or that is missing
};

/// Throws ZTCBadFilterEx for a port that nobody knows.
ZTSPathsFilter readPathsFilter(const ZTSFilterTexts& acrTexts, const ZTCNameBook& acrNames, bool aIsTroubleOnly);

bool matches(const ZTSSanLun& acrLun, const ZTSPathsFilter& acrFilter);

struct ZTSPathsRequest {
    ZTSPathsFilter mFilter{};
    ZTCHistoryTime mTime{};    ///< the moment that is shown
    bool mIsEachPath = false;  ///< as text: a line for each path, not only for those with a trouble
};

/// A row for each unit, below it those of its paths that do not run; then all in one line, and the troubles.
/// @param aTableWidth  0: no limit
std::string formatPaths(const ZTSSanView& acrView, const ZTSPathsRequest& acrRequest, const ZTCNameBook& acrNames,
                        std::size_t aTableWidth, const ZTSTextStyle& acrStyle);

/// The document `tavik.paths/1`. docs/tavik.md documents it. @param apView  null: no topology was stored by then
nlohmann::ordered_json makePathsDocument(const ZTSSanView* apView, const ZTSPathsRequest& acrRequest,
                                         const ZTCNameBook& acrNames, const std::string& acrHost,
                                         const std::string& acrStoreId);

#endif
