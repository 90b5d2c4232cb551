/// The threads of a system's components.

#ifndef SYSTEM_INCLUDE_THREADTABLE_H
#define SYSTEM_INCLUDE_THREADTABLE_H

#include <atomic>
#include <list>

#include "os/common/include/Os.h"
#include "os/common/include/ProcessEvents.h"
#include "os/common/include/ThreadComponent.h"

/// Belongs to the main thread, but for noteEnd(), which each thread calls as its last act.
class ZTCThreadTable {
public:
    ZTCThreadTable() = default;

    ZTCThreadTable(const ZTCThreadTable&) = delete;
    ZTCThreadTable& operator=(const ZTCThreadTable&) = delete;

    /// Adds a thread that has not been started. Its arguments live as long as the table. Throws ZTCNoMemoryEx.
    void add(ZTCThreadComponent* apComponent, ZTCSystemInterface* apSystemInterface);

    /// Starts thread aIndex at the procedure, which gets a ZTSThreadArguments. Throws ZTCInvalidEx where there is none
    /// or it was started, ZTCOsThreadEx where it cannot be.
    void start(unsigned aIndex, void* (*apProcedure)(void*));

    bool isStarted(unsigned aIndex) const;
    unsigned size() const { return static_cast<unsigned>(mThreads.size()); }

    /// Whether every thread that was started has ended.
    bool haveAllEnded() const;

    void noteEnd() noexcept;

    /// Raised whenever a thread has ended; the thread that looks takes it back.
    ZTCProcessEvent& getEndEvent() { return mEndEvent; }

    /// Waits for every thread that was started.
    void joinAll();

private:
    struct ZTSEntry {
        ZTSThreadArguments mArguments;
        ZTSOsThread mThread;
        bool mIsStarted;
        bool mIsJoined;
    };

    std::list<ZTSEntry> mThreads;
    unsigned mNumberOfStarted = 0;

    // Release on the way up, acquire where it is read: a reader that sees a thread's end sees what it did.
    std::atomic<unsigned> mNumberOfEnded{0};
    ZTCProcessEvent mEndEvent;
};

#endif
