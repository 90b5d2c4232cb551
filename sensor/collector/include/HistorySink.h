/// What the collecting side hands over to the history. Everything is taken in the order of the calls.
#ifndef SENSOR_COLLECTOR_INCLUDE_HISTORYSINK_H
#define SENSOR_COLLECTOR_INCLUDE_HISTORYSINK_H

#include <memory>
#include <string>

#include "sensor/client/include/StatusPageReader.h"
#include "sensor/collector/include/Spool.h"
#include "sensor/store/include/HistoryTime.h"

using ZTCPagePointer = std::shared_ptr<const ZTSStatusSnapshot>;

/// An agent that has ended, and all of whose frames have been handed over.
struct ZTSEndedAgent {
    std::string mGeneration;
    std::string mPagePath;     ///< the file is removed once it is dealt with; empty: there is none
    ZTCPagePointer mpPage;     ///< the last one; null: not known
    ZTCHistoryTime mFrom;      ///< until here nothing can be missing
    ZTCHistoryTime mTo;        ///< when it ended, as far as that is known
    bool mIsVanished = false;  ///< it did not end in order
    std::string mReason;       ///< for people, one line
};

class ZTCHistorySink {
public:
    virtual ~ZTCHistorySink() = default;

    /// A frame or torn file of the spool, which is removed when it is stored. @param apPage  the page as it was when
    /// the frame was whole, or later; null: not known. It is stored together with the frame, so that what is stored is
    /// never more than what the page says was handed over
    virtual void takeIn(const ZTSSpoolEntry& acrEntry, ZTCPagePointer apPage) = 0;
    /// The page of the running agent, at a look.
    virtual void notePage(ZTCPagePointer apPage) = 0;
    virtual void endAgent(ZTSEndedAgent aAgent) = 0;
};

#endif
