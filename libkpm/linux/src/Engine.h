/// The kernel's library between Init and Close: answers the entries, and runs the thread that watches the FC hosts of
/// this machine and delivers what happens to them.
///
/// Threads. One thread of its own does everything after start(): it waits for FC messages, trace records and the next
/// look at sysfs, has the watcher and the feeds handle them, and calls the callbacks, one at a time and with no lock
/// held. It has ended when stop() returns.
#ifndef LIBKPM_LINUX_SRC_ENGINE_H
#define LIBKPM_LINUX_SRC_ENGINE_H

#include <poll.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <string>
#include <thread>
#include <vector>

#include "libkpm/common/include/Descriptor.h"
#include "libkpm/common/include/Losses.h"
#include "libkpm/common/include/RegistrationDesk.h"
#include "libkpm/linux/src/Delivery.h"
#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/HostWatcher.h"
#include "libkpm/linux/src/KindSources.h"
#include "libkpm/linux/src/MessageFeed.h"
#include "libkpm/linux/src/OutcomeFeed.h"
#include "libkpm/linux/src/QueueDepths.h"
#include "libkpm/linux/src/SourceReports.h"
#include "libkpm/linux/src/Sources.h"
#include "libkpm/linux/src/Sysfs.h"

struct ZTSLinuxOptions {
    std::string mSysfsRoot = "/sys";
    ZTSTracePlace mTracePlace{};
    std::chrono::milliseconds mPollInterval{2000};
};

/// All operations but start and stop may be called from any thread.
class ZTCLinuxEngine : public ZTCRegistrationDesk {
public:
    /// `arSources` outlives the engine.
    ZTCLinuxEngine(ZTSLinuxOptions aOptions, ZTCLinuxSources& arSources);
    ~ZTCLinuxEngine() override;

    /// Finds the hosts, opens the sources, says what is missing, and starts the thread. Throws std::system_error or
    /// std::bad_alloc, with nothing left running.
    void start();

    /// Ends and joins the thread, and closes the sources. Not to be called from a callback. More than once does no
    /// harm.
    void stop();

    std::uint32_t getNumberOfAdapters() const override { return mWatcher.countBoards(); }

protected:
    std::uint32_t answerAdapterInfo(std::uint32_t aBoard, ZTSBoardNames& arNames) override;
    bool isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const override;
    std::optional<std::size_t> findKind(std::uint32_t aCategory, std::uint32_t aSubcategory) const override;
    ZTSRegistrationAnswer answerRegistration(std::uint32_t aBoard, std::size_t aKind) override;

private:
    using Clock = std::chrono::steady_clock;

    ZTEFeedState getSourceState(std::size_t aKind) const;
    void tellMissing() const;

    // The thread's.
    void run();
    void runRound();
    void finish();
    void waitForWork();
    void waitAfterFailure();
    void look();
    void noteHosts();
    void report();
    ZTSSourceReport makeReport(const ZTSLinuxBoard& acrBoard, std::size_t aKind) const;

    // Constant after construction.
    const ZTSLinuxOptions mOptions;
    const ZTCSysfs mSysfs;
    const ZTCLibraryDescriptor mWake;  // an eventfd that is readable once the engine stops
    const ZTCLinuxDelivery mDelivery;

    // With synchronisation of their own.
    std::atomic<bool> mIsStopping{false};

    // Used by start() and stop() alone.
    std::thread mThread;

    // Used by start() before the thread is there, and by the thread; some of their operations by any thread.
    ZTCLosses mLosses;
    ZTCLinuxHostWatcher mWatcher;
    ZTCLinuxQueueDepths mDepths;
    ZTCLinuxMessageFeed mMessages;
    ZTCLinuxOutcomeFeed mOutcomes;

    // Used by start() before the thread is there, and by the thread.
    std::vector<pollfd> mPolls;
    Clock::time_point mNextLook{};
    std::uint64_t mHostsVersion = 0;  // of the hosts that the feeds were told of
    ZTCSourceReports mReports;
};

#endif
