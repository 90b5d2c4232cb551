/// Watches what the administrator wants to be warned of, and runs the programs that warn.
///
/// A thread of its own reads the history and the live state, decides by the book, and watches the programs: nothing
/// here holds up collecting. A program that is missing, fails, hangs or leaves processes behind is reported in a line,
/// counted, and among the open warnings until it works again.
#ifndef SENSOR_WARNINGS_INCLUDE_WARNINGS_H
#define SENSOR_WARNINGS_INCLUDE_WARNINGS_H

#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "sensor/client/include/EventBell.h"
#include "sensor/settings/include/Settings.h"
#include "sensor/store/include/History.h"
#include "sensor/views/include/LiveState.h"
#include "sensor/warnings/include/HookProcess.h"
#include "sensor/warnings/include/WarnBook.h"
#include "sensor/warnings/include/WarnDocument.h"
#include "sensor/warnings/include/WarnSource.h"

/// Name of the stored value with the open troubles.
inline constexpr const char* gcWarnBookValue = "warn.book";
/// Programs that run at the same time; others wait for their turn.
inline constexpr std::size_t gcMostHooks = 4;

struct ZTSWarningsSetup {
    std::string mStateDirectory;
    std::string mHost;
    std::string mFailuresValue;  ///< name of the stored value that counts failures of hooks
    /// Stores a value in the history, soon; called on any thread.
    std::function<void(const std::string& acrName, const std::string& acrValue)> mSetValue;
    /// A line for people; called on the warnings' thread.
    std::function<void(const std::string& acrLine)> mReport;
};

/// What came of running every hook with a test record.
struct ZTSHookTest {
    std::uint64_t mTicket = 0;
    std::string mAnswer;  ///< {"hooks": [{"kind", "run", "problem"}]}, or {"error"}; one line
};

class ZTCWarnings {
public:
    /// Starts the thread. The history is not touched before the first openHistory().
    ZTCWarnings(ZTSWarningsSetup aSetup, const ZTSSettings& acrSettings);
    /// Ends the hooks that run, and the thread.
    ~ZTCWarnings();
    ZTCWarnings(const ZTCWarnings&) = delete;
    ZTCWarnings& operator=(const ZTCWarnings&) = delete;

    // Any thread; none of them waits.
    void setSettings(const ZTSSettings& acrSettings);
    /// The running sensor's live state as JSON in one line. Something new may be in the history, too.
    void setLive(std::string aLive);
    /// The database can be read from now on.
    void openHistory();
    /// Runs every hook with a test record. Returns how long that can take at most; takeTests() has the result then.
    std::chrono::milliseconds test(std::uint64_t aTicket);
    std::vector<ZTSHookTest> takeTests();
    /// Readable when takeTests() has something; takeTests() reads it empty.
    int getBell() const { return mBell.getDescriptor(); }
    /// The open warnings as a JSON list, as LiveState.h describes it.
    std::string describe() const;

private:
    struct ZTSHook {
        std::size_t mRule = 0;
        ZTSWarnRule mSettings;
        std::optional<std::uint64_t> mTicket;  ///< of a test
        std::unique_ptr<ZTCHookProcess> mpProcess;
        std::string mInput;
        std::vector<std::string> mEnvironment;
    };
    struct ZTSTest {
        std::uint64_t mTicket = 0;
        std::vector<std::optional<std::string>> mResults;  ///< by rule
    };

    void run();
    bool wait();
    void applySettings();
    void readHistory();
    void readSanFacts();
    void readLive();
    void warn();
    void beginTest();
    void startHooks();
    void stepHooks();
    void noteEnd(const ZTSHook& acrHook, const std::string& acrProblem);
    void endTest();
    ZTSWarnDocument makeDocument(const ZTSTrouble& acrTrouble);
    std::string makeInput(const ZTSWarnDocument& acrDocument);
    ZTCNameBook makeNames() const;
    void save();
    void publish();

    const ZTSWarningsSetup mSetup;
    const ZTCEventBell mBell;
    const ZTCEventBell mWakeUp;  ///< ends the thread's poll()
    const std::chrono::steady_clock::time_point mStart;

    // ---- of the thread ----
    ZTSSettings mSettings;
    std::unique_ptr<ZTCWarnBook> mpBook;
    std::unique_ptr<ZTCWarnSource> mpSource;
    std::unique_ptr<ZTCHistory> mpHistory;
    ZTSLiveState mLive;
    std::optional<ZTSSanFacts> mSan;  ///< absent: no rule asks for it, or it is not known
    std::chrono::steady_clock::time_point mNextSan{};
    bool mHasLive = false;
    bool mIsLoaded = false;  ///< the open troubles of the process before this one are in the book
    std::string mSaved;
    std::uint64_t mFailures = 0;         ///< in all; of this process, until the stored number was read
    std::vector<std::string> mProblems;  ///< by rule; empty: its hook works, as far as that is known
    std::list<ZTSHook> mHooks;           ///< running ones first, then those that wait
    std::optional<ZTSTest> mTest;

    // ---- guarded by mMutex ----
    mutable std::mutex mMutex;
    bool mIsStopping = false;
    bool mMayRead = false;
    std::optional<ZTSSettings> mNewSettings;
    std::optional<std::string> mNewLive;
    std::vector<std::uint64_t> mNewTests;
    std::vector<ZTSHookTest> mDoneTests;
    std::string mDescription = "[]";
    bool mHasRules = false;
    std::chrono::milliseconds mTestTime{};

    std::thread mThread;
};

#endif
