/// The agent's system object in the test's own process: brought up by its own preInit and init, over an adapters'
/// library, a directory and a log of the test's own. No thread of the agent runs; the test calls what they would call.
#ifndef TESTS_UNIT_TAVIK_SUPPORT_TAVIKFIXTURE_H
#define TESTS_UNIT_TAVIK_SUPPORT_TAVIKFIXTURE_H

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "tavik/include/TavikProtocolHandler.h"
#include "tavik/include/TavikSystem.h"
#include "tests/support/Bytes.h"
#include "tests/support/ScopeDataResponse.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/agentcommon/support/AdaptersLibraryDouble.h"
#include "tests/unit/agentcommon/support/TestLog.h"

/// The agent's system with its slots open to the test, and its waits and exit request to be scripted.
class ZTCTestTavikSystem : public ZTCTavikSystem {
public:
    ZTCTestTavikSystem() : ZTCTavikSystem(ZTCString(gcTavikName)) {}

    /// Null: what the base class does.
    std::function<void(unsigned aReader, unsigned aSeconds)> mWaitForActivity;
    std::function<void(unsigned aConditional, unsigned aSeconds)> mTimedWait;
    std::function<void()> mMakeThreadsToExit;

    void waitForActivity(unsigned aReader, unsigned aSeconds) override;
    void timedWait(unsigned aConditional, unsigned aSeconds) override;
    void makeThreadsToExit() override;

    const ZTCVector<ZTSCommandLineArgumentDesc>& options() const { return mCmdLineArgDescs; }
    const ZTCVector<ZTCPointer<ZTCConditional>>& conditionals() const { return mConditionals; }
    const ZTCVector<ZTCPointer<ZTCThreadComponent>>& threadComponents() const { return mThreadComponents; }
    ZTCVector<ZTCPointer<ZTCReader>>& readers() { return mReaders; }
    ZTCVector<ZTCPointer<ZTCWriter>>& writers() { return mWriters; }

    // What is guarded by the previous-data lock, each taking it for one look.
    bool hasPendingRecord();
    unsigned pendingBoard();
    std::string pendingDataHex();
    unsigned pendingCapacity();
    bool hasRecordList(unsigned aBoard);
    unsigned recordListSize(unsigned aBoard);
    bool canAddToPendingRecord(unsigned aLength);
    /// The names of the target under this FC id or port name, "NODE, PORT, FCID"; empty where there is none.
    std::string targetByFcId(unsigned aFcId);
    std::string targetByPortName(const ZTSWwn& acrPortName);

    /// Makes a pending record of so many bytes: so the running total gets any value.
    void makePendingRecord(unsigned aBoard, unsigned aSize);
    void appendToPendingRecord(const ZTCBytes& acrBytes);
    void countOnPendingRecord();
    void filePendingRecord();
    /// Puts the lists of so many boards into the place of those that are there.
    void exchangeRecordLists(unsigned aBoards);
};

/// A register-targets request's target.
struct ZTSTestTarget {
    ZTSWwn mNodeName;
    ZTSWwn mPortName;
    unsigned mFcId;
};

/// Responses without data, as hex.
inline constexpr const char* gcSuccessHex = "0000000000";
inline constexpr const char* gcInvalidHex = "010006";
inline constexpr const char* gcNotAllowedHex = "010009";

class ZTCTavikFixture : public testing::Test {
protected:
    /// Everything is ready for preInit; the environment names the test's directory.
    ZTCTavikFixture();
    ~ZTCTavikFixture() override;

    /// preInit and init, with a reader of the response FIFO, so that nothing waits. The log then begins anew.
    void bringUp(unsigned aAdapters = 1);
    /// The same, and a start command.
    void collect(unsigned aAdapters = 1, unsigned aMaxEventDataSize = 4096);

    /// One request, handled on this thread; the response's body.
    ZTCBytes request(const ZTCBytes& acrBody);
    std::string requestHex(std::string_view aBodyHex) { return hexOf(request(bytesOf(aBodyHex))); }
    void startScope(unsigned aMaxEventDataSize = 4096);
    std::string registerTargets(const std::vector<ZTSTestTarget>& acrTargets);
    ZTSScopeDataResponse retrieve();
    /// A retrieval's records of one board, as ZTSEncodedRecord::text writes them.
    std::vector<std::string> retrieveTexts(std::size_t aList = 0) { return retrieve().texts(aList); }

    /// To be called first in a statement that ends the process: its log goes to standard error, its directory goes
    /// away.
    void prepareToDie() const;

    std::string commandFifoPath() const { return mDirectory.path("qrvtvkcmd.fifo"); }
    std::string responseFifoPath() const { return mDirectory.path("qrvtvkout.fifo"); }
    std::string pidFilePath() const { return mDirectory.path("qrv-tvk.pid"); }
    std::string sensorPidFilePath() const { return mDirectory.path("qrv-sn.pid"); }

    ZTCTemporaryDirectory mDirectory;
    ZTCTestLog mLog;
    ZTCAdaptersLibraryDouble mLibrary;
    std::unique_ptr<ZTCTestTavikSystem> mSystem;

private:
    int mResponseReader = -1;
};

/// The text that a process leaves on standard error when this assertion fails, as a regular expression.
std::string failedAssertion(const std::string& acrCondition);

#endif
