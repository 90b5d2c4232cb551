/// An agent's side of the library for tests: registers like an agent and keeps what the callbacks were given.
#ifndef TESTS_UNIT_SIM_RECORDER_H
#define TESTS_UNIT_SIM_RECORDER_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "libkpm/sim/src/Engine.h"

struct ZTSRecordedEvent {
    unsigned mBoard = 0;
    HBA_wwn mLocal{};
    unsigned mCategory = 0;     ///< of the scope callback; 0 for the others
    unsigned mSubcategory = 0;  ///< likewise; the event type for the others
    void* mpContext = nullptr;
    bool mHasPayload = false;
    bool mHasData = false;
    std::uint64_t mSize = 0;  ///< zt_evt_size
    unsigned mLength = 0;     ///< of the RSCN callback
    std::vector<std::uint8_t> mData;
    std::uintptr_t mAddress = 0;  ///< of the data

    /// Everything that does not depend on addresses, to compare and sort by.
    std::string describe() const;
};

/// The one recorder of a test. The callbacks of three kinds have no context, so that there is one at a time.
class ZTCRecorder {
public:
    ZTCRecorder();
    ~ZTCRecorder();
    ZTCRecorder(const ZTCRecorder&) = delete;
    ZTCRecorder& operator=(const ZTCRecorder&) = delete;

    /// Registers one kind, or all kinds in catalogue order, on a board. Returns the handle, 0 where it was refused.
    std::uint32_t registerKind(ZTCSimEngine& arEngine, std::uint32_t aBoard, const char* apKind);
    void registerAll(ZTCSimEngine& arEngine, std::uint32_t aBoard);

    std::vector<ZTSRecordedEvent> getEvents() const;
    std::size_t getCount() const;
    /// Waits until there are as many events.
    void waitForCount(std::size_t aCount) const;
    std::multiset<std::string> getDescriptions() const;
    std::set<std::thread::id> getThreads() const;

    /// Called inside every callback.
    void setHook(std::function<void()> aHook) { mHook = std::move(aHook); }

    void record(ZTSRecordedEvent aEvent);

    static void onScope(unsigned aBoard, HBA_wwn aPort, unsigned aCategory, unsigned aSubcategory, void* apContext,
                        ZT_event* apEvent);
    /// What to register for a board's event type.
    static KPM_EventCallback getEventCallback(std::uint32_t aEventType);

private:
    std::function<void()> mHook;
    mutable std::mutex mLock;
    std::vector<ZTSRecordedEvent> mEvents;  // guarded by mLock
    std::set<std::thread::id> mThreads;     // guarded by mLock
};

/// The scenario of a text that parses.
ZTSSimScenario readScenario(const std::string& acrText);

/// Two adapters, hba0 and hba1, and two remote ports, disk0 and tape0.
extern const char* const gcTwoAdapters;

/// The scenario of these, with further lines behind them.
ZTSSimScenario readTwoAdapters(const std::string& acrLines = "");

/// Plays a line now. Returns what inject() returns.
std::uint64_t injectLine(ZTCSimEngine& arEngine, const std::string& acrLine);

#endif
