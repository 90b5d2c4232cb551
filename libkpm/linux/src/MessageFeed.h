/// The feed of FC messages from the kernel: opens the socket, reads it, delivers RSCNs, and passes messages about links
/// to the watcher. It reports its own state, and opens its source again after a failure.
///
/// Used by the library's thread alone (and by start(), before there is one), save for getState().get().
#ifndef LIBKPM_LINUX_SRC_MESSAGEFEED_H
#define LIBKPM_LINUX_SRC_MESSAGEFEED_H

#include <chrono>
#include <cstdint>
#include <memory>
#include <vector>

#include "libkpm/common/include/Losses.h"
#include "libkpm/linux/src/Delivery.h"
#include "libkpm/linux/src/EventSequence.h"
#include "libkpm/linux/src/FcEventSocket.h"
#include "libkpm/linux/src/FcMessage.h"
#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/HostWatcher.h"
#include "libkpm/linux/src/Sources.h"

class ZTCLinuxMessageFeed {
public:
    /// All but the interval outlive the feed. `aPollInterval` is named in the log.
    ZTCLinuxMessageFeed(ZTCLinuxSources& arSources, ZTCLinuxHostWatcher& arWatcher, const ZTCLinuxDelivery& acrDelivery,
                        ZTCLosses& arLosses, std::chrono::milliseconds aPollInterval);

    /// There is an FC host: the socket is opened, if it was not tried before.
    void noteHosts() { happen(ZTFH_HostFound); }

    /// The descriptor to wait for; -1 for none.
    int getDescriptor() const { return mState.get() == ZTFS_Working ? mpSource->getDescriptor() : -1; }

    /// The descriptor is readable: reads what is there, up to a limit, so that the other sources have their turn.
    void serve();

    /// A regular look, after the watcher's.
    void look();

    void stop() { happen(ZTFH_Stop); }

    const ZTCFeedState& getState() const { return mState; }

private:
    void happen(ZTEFeedHappening aHappening, const std::string& acrReason = std::string());
    void open();
    void tell() const;
    void readDatagram(ZTCByteSpan aDatagram);
    void handle(const ZTSLinuxFcEvent& acrEvent);

    // Constant after construction.
    ZTCLinuxSources& mrSources;
    ZTCLinuxHostWatcher& mrWatcher;
    const ZTCLinuxDelivery& mrDelivery;
    ZTCLosses& mrLosses;
    const std::chrono::milliseconds mPollInterval;

    // Used by the library's thread alone.
    ZTCFeedState mState;
    ZTCRetryPause mPause;
    std::unique_ptr<ZTCFcEventSource> mpSource;  // set while the state is Working or Resting
    bool mIsDrained = true;                      // when it was last read, nothing was left
    ZTCLinuxEventSequence mSequence;             // goes on when the socket is opened anew: what was missed counts
    std::vector<std::uint8_t> mDatagram;
};

#endif
