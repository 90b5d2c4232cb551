/// The topology of the history at a time, judged by what was there before.
#ifndef SENSOR_VIEWS_INCLUDE_SANVIEW_H
#define SENSOR_VIEWS_INCLUDE_SANVIEW_H

#include <array>
#include <chrono>
#include <optional>

#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/views/include/SanFacts.h"

struct ZTSSanView {
    ZTSTopology mTopology;
    ZTSSanFacts mFacts;
    ZTCHistoryTime mScanned;  ///< when the topology was read
    bool mIsStale = false;    ///< files of the kernel did not answer: what they say is as of earlier
};

/// The moments at which links and remote ports that are away now count as missing if they were up then. The paths of a
/// LUN are measured by the most that it ever had, as far back as the history and the newest mark "baseline" reach.
inline constexpr std::array<std::chrono::hours, 3> gcEarlierMoments{std::chrono::hours(1), std::chrono::hours(24),
                                                                    std::chrono::hours(7 * 24)};

/// Absent: no topology was stored by then. Throws what ZTCHistory throws.
std::optional<ZTSSanView> readSan(const ZTCHistory& acrHistory, ZTCHistoryTime aTime);

/// Adds the ports of a topology to what names can stand for: they may never have had an event.
void addPorts(ZTCNameBook& arNames, const ZTSTopology& acrTopology);

#endif
