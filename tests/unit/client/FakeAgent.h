/// The agent's end of the two FIFOs, played by a thread of the test: it does with each request what a script says.
#ifndef TESTS_UNIT_CLIENT_FAKEAGENT_H
#define TESTS_UNIT_CLIENT_FAKEAGENT_H

#include <atomic>
#include <deque>
#include <functional>
#include <future>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "sensor/client/include/CommandEncoder.h"
#include "sensor/client/include/FileDescriptor.h"
#include "tests/support/TestThreads.h"

class ZTCFakeAgent {
public:
    /// Runs on the agent's thread with each request's body.
    using ZTCStep = std::function<void(ZTCFakeAgent&, const ZTCWireBytes&)>;

    /// Makes the FIFOs, holds the pid file as an agent does, and starts the thread. The thread opens the command FIFO,
    /// waits for a reader of the response FIFO, and takes one step a request. The last step serves all further ones.
    ZTCFakeAgent(std::string aDirectory, std::deque<ZTCStep> aSteps);
    /// Ends the thread and closes the files; they stay in the directory, as with an agent that was killed.
    ~ZTCFakeAgent();
    ZTCFakeAgent(const ZTCFakeAgent&) = delete;
    ZTCFakeAgent& operator=(const ZTCFakeAgent&) = delete;

    std::vector<ZTCWireBytes> getRequests() const;

    /// From now on a collection period of 0 gets its refusal without a step and without being recorded.
    void refusePeriodOfZero() { mRefusesPeriodOfZero = true; }

    // For steps only.
    void sendFrame(const ZTCWireBytes& acrBody);
    void sendRaw(const ZTCWireBytes& acrBytes);
    /// Closes both FIFOs and ends the thread behind the step.
    void die();

    static ZTCStep answering(const ZTCWireBytes& acrBody);
    static ZTCStep answeringRaw(const ZTCWireBytes& acrBytes);
    /// Sends the first half of the answer's frame, and the other half once the future is ready.
    static ZTCStep answeringInHalves(const ZTCWireBytes& acrBody, std::shared_future<void> aGoOn);
    static ZTCStep silent();
    static ZTCStep dying(const ZTCWireBytes& acrLastBytes);

private:
    void holdPidFile();
    void run();
    bool waitFor(int aDescriptor, short aEvents);
    bool readExactly(ZTCWireBytes& arBytes, std::size_t aCount);

    const std::string mDirectory;
    std::deque<ZTCStep> mSteps;
    ZTCFileDescriptor mPidFile;
    ZTCFileDescriptor mStop;
    ZTCFileDescriptor mCommandFifo;
    ZTCFileDescriptor mOwnCommandWriter;
    ZTCFileDescriptor mResponseFifo;
    std::atomic<bool> mRefusesPeriodOfZero{false};
    bool mIsDead = false;
    mutable std::mutex mMutex;
    std::vector<ZTCWireBytes> mRequests;  // under mMutex
    std::optional<ZTCTestThread> mThread;
};

/// Makes the two FIFOs without anybody behind them.
void makeFifos(const std::string& acrDirectory);

#endif
