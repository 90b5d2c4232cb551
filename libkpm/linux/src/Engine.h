/// Watches the FC hosts of this machine and delivers what happens to them to the callbacks that are registered.
///
/// Threads. One thread of its own, the watcher, does everything after start(): it waits for FC messages, trace records
/// and the next look at sysfs, and calls the callbacks, one at a time and with no lock held. It has ended when stop()
/// returns.
#ifndef LIBKPM_LINUX_SRC_ENGINE_H
#define LIBKPM_LINUX_SRC_ENGINE_H

#include <poll.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "libkpm/common/include/Descriptor.h"
#include "libkpm/common/include/LibraryStatus.h"
#include "libkpm/include/libkpm.h"
#include "libkpm/linux/src/Boards.h"
#include "libkpm/linux/src/EventSequence.h"
#include "libkpm/linux/src/FcEventSocket.h"
#include "libkpm/linux/src/FcMessage.h"
#include "libkpm/linux/src/KindSources.h"
#include "libkpm/linux/src/LinkState.h"
#include "libkpm/linux/src/Losses.h"
#include "libkpm/linux/src/Registry.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/Sysfs.h"
#include "libkpm/linux/src/TraceInstance.h"

/// Opens the sources that need rights; tests have their own.
class ZTCLinuxSources : public ZTCTraceDirectories {
public:
    /// As ZTCFcEventSocket::open.
    virtual std::unique_ptr<ZTCFcEventSource> openFcEvents(std::string& arProblem);
};

struct ZTSLinuxOptions {
    std::string mSysfsRoot = "/sys";
    /// The first is used that has instances.
    std::vector<std::string> mTracefsRoots{"/sys/kernel/tracing", "/sys/kernel/debug/tracing"};
    std::chrono::milliseconds mPollInterval{2000};
};

/// All operations but start and stop may be called from any thread.
class ZTCLinuxEngine {
public:
    /// `arSources` outlives the engine.
    ZTCLinuxEngine(ZTSLinuxOptions aOptions, ZTCLinuxSources& arSources);
    ~ZTCLinuxEngine();
    ZTCLinuxEngine(const ZTCLinuxEngine&) = delete;
    ZTCLinuxEngine& operator=(const ZTCLinuxEngine&) = delete;

    /// Finds the hosts, opens the sources, says what is missing, and starts the watcher. Throws std::system_error or
    /// std::bad_alloc, with nothing left running.
    void start();

    /// Ends and joins the watcher, and closes the sources. Not to be called from a callback. More than once does no
    /// harm.
    void stop();

    std::uint32_t getNumberOfAdapters() const { return mCount.load(std::memory_order_relaxed); }
    std::uint32_t getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) const;
    std::uint32_t registerForPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aCategory,
                                  std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                  KPM_ScopeCallback apCallback);
    std::uint32_t unregisterForPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aHandle);
    std::uint32_t registerForBoard(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                   KPM_EventCallback apCallback);
    std::uint32_t unregisterForBoard(std::uint32_t aBoard, std::uint32_t aHandle);

private:
    using Clock = std::chrono::steady_clock;

    bool hasSource(std::size_t aKind) const;
    bool isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const;

    // The watcher's.
    void openSources();
    void openTrace();
    void tellMissing() const;
    void run();
    void runRound();
    void waitForWork();
    void look();
    void lookAtLinks();
    void lookAtLink(std::uint32_t aBoard);
    void readMessages();
    void readDatagram(ZTCByteSpan aDatagram);
    void handleMessage(const ZTSLinuxFcEvent& acrEvent);
    void readTrace(std::size_t aBuffer);
    bool readPage(ZTCByteSpan aPage);
    void readTraceLosses();
    void handleOutcome(const ZTSScsiOutcome& acrOutcome);
    void handleHostChanges(const ZTCLinuxBoards::Changes& acrChanges);
    void watchHosts();

    void deliverScope(std::uint32_t aBoard, std::size_t aKind, const void* apData, std::size_t aSize);
    void deliverLink(std::uint32_t aBoard, const ZTSLinuxLinkChange& acrChange);
    void deliverRscn(std::uint32_t aBoard, std::vector<std::uint8_t>& arPayload);

    // Constant after construction.
    const ZTSLinuxOptions mOptions;
    ZTCLinuxSources& mrSources;
    const ZTCSysfs mSysfs;
    const ZTCLibraryDescriptor mWake;  // an eventfd that is readable once the engine stops

    // With synchronisation of their own.
    ZTCLinuxRegistry mRegistry;
    std::atomic<std::uint32_t> mCount{0};
    std::atomic<bool> mIsStopping{false};
    std::atomic<bool> mHasMessages{false};
    std::atomic<bool> mHasTrace{false};

    // Used by start() and stop() alone.
    std::thread mThread;

    mutable std::mutex mLock;
    ZTCLinuxBoards mBoards;  // written by the watcher alone, with mLock held; read by it without, by others with it

    // Used by start() before the watcher is there, by the watcher, and by stop() after it.
    struct Buffer {
        bool mIsReady = false;     // to be read in this round
        bool mIsResting = false;   // was said to be readable and was not: left alone until the next look
        bool mHasRecords = false;  // was read from since its losses were looked at
        bool mHasLoss = false;     // a page said so since then
    };

    bool mAreSourcesOpen = false;
    bool mHasLookedForHost = false;  // a message of an unknown host has made a look since the last regular one
    bool mIsSocketReady = false;
    bool mIsSocketDrained = true;  // nothing was left to read when it was last read
    bool mIsSocketResting = false;
    std::unique_ptr<ZTCFcEventSource> mpMessages;
    std::unique_ptr<ZTCTraceInstance> mpTrace;
    std::vector<Buffer> mBuffers;
    std::vector<pollfd> mPolls;
    std::vector<ZTCLinuxLinkState> mLinks;  // by board
    ZTCLinuxEventSequence mSequence;
    ZTCLinuxRemotePorts mRemotePorts;
    ZTCLinuxLosses mLosses;
    std::vector<std::uint8_t> mDatagram;
    std::vector<std::uint8_t> mPage;
    Clock::time_point mNextLook{};
};

#endif
