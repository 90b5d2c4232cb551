#include "tests/unit/client/FakeAgent.h"

#include <fcntl.h>
#include <poll.h>
#include <pthread.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <stdexcept>

void makeFifos(const std::string& acrDirectory) {
    for (const char* lpName : {gcCommandFifoName, gcResponseFifoName}) {
        if (mkfifo((acrDirectory + lpName).c_str(), 0600) != 0 && errno != EEXIST) {
            throw std::runtime_error("mkfifo " + acrDirectory + lpName);
        }
    }
}

ZTCFakeAgent::ZTCFakeAgent(std::string aDirectory, std::deque<ZTCStep> aSteps)
    : mDirectory(std::move(aDirectory)), mSteps(std::move(aSteps)), mStop(eventfd(0, EFD_CLOEXEC)) {
    makeFifos(mDirectory);
    holdPidFile();
    mCommandFifo = ZTCFileDescriptor::open((mDirectory + gcCommandFifoName).c_str(), O_RDONLY | O_NONBLOCK);
    // Held so that the FIFO never shows an end of file between two clients.
    mOwnCommandWriter = ZTCFileDescriptor::open((mDirectory + gcCommandFifoName).c_str(), O_WRONLY | O_NONBLOCK);
    if (!mStop.isOpen() || !mOwnCommandWriter.isOpen()) {
        throw std::runtime_error("the fake agent cannot open its command FIFO");
    }
    mThread.emplace([this] { run(); });
}

/// Keeps the pid that a test has put into the file; else writes that of the test.
void ZTCFakeAgent::holdPidFile() {
    mPidFile = ZTCFileDescriptor::open((mDirectory + gcAgentPidFileName).c_str(), O_RDWR | O_CREAT, 0600);
    const std::string lPid = std::to_string(getpid()) + "\n";
    if (!mPidFile.isOpen() || flock(mPidFile.get(), LOCK_EX | LOCK_NB) != 0 ||
        (lseek(mPidFile.get(), 0, SEEK_END) == 0 && write(mPidFile.get(), lPid.data(), lPid.size()) < 0)) {
        throw std::runtime_error("the fake agent cannot hold its pid file");
    }
}

ZTCFakeAgent::~ZTCFakeAgent() {
    const std::uint64_t lOne = 1;
    [[maybe_unused]] const ssize_t lWritten = write(mStop.get(), &lOne, sizeof(lOne));
    mThread->join();
}

std::vector<ZTCWireBytes> ZTCFakeAgent::getRequests() const {
    const std::lock_guard lLock(mMutex);
    return mRequests;
}

/// False: told to stop.
bool ZTCFakeAgent::waitFor(int aDescriptor, short aEvents) {
    std::array<pollfd, 2> lFds{{{mStop.get(), POLLIN, 0}, {aDescriptor, aEvents, 0}}};
    while (poll(lFds.data(), lFds.size(), -1) < 0 && errno == EINTR) {
    }
    return lFds[0].revents == 0;
}

bool ZTCFakeAgent::readExactly(ZTCWireBytes& arBytes, std::size_t aCount) {
    while (arBytes.size() < aCount) {
        if (!waitFor(mCommandFifo.get(), POLLIN)) {
            return false;
        }
        ZTCWireBytes lPart(aCount - arBytes.size());
        const ssize_t lCount = read(mCommandFifo.get(), lPart.data(), lPart.size());
        arBytes.insert(arBytes.end(), lPart.begin(), lPart.begin() + std::max<ssize_t>(lCount, 0));
    }
    return true;
}

void ZTCFakeAgent::sendRaw(const ZTCWireBytes& acrBytes) {
    std::size_t lWritten = 0;
    while (lWritten < acrBytes.size() && waitFor(mResponseFifo.get(), POLLOUT)) {
        const ssize_t lCount = write(mResponseFifo.get(), acrBytes.data() + lWritten, acrBytes.size() - lWritten);
        if (lCount < 0 && errno != EAGAIN && errno != EINTR) {
            return;  // the reader has vanished
        }
        lWritten += static_cast<std::size_t>(std::max<ssize_t>(lCount, 0));
    }
}

static ZTCWireBytes sMakeFrame(const ZTCWireBytes& acrBody) {
    ZTCWireBytes lFrame;
    for (int lShift = 24; lShift >= 0; lShift -= 8) {
        lFrame.push_back(static_cast<std::uint8_t>(acrBody.size() >> lShift));
    }
    lFrame.insert(lFrame.end(), acrBody.begin(), acrBody.end());
    return lFrame;
}

void ZTCFakeAgent::sendFrame(const ZTCWireBytes& acrBody) {
    sendRaw(sMakeFrame(acrBody));
}

void ZTCFakeAgent::die() {
    mIsDead = true;
}

void ZTCFakeAgent::run() {
    sigset_t lSigpipe;
    sigemptyset(&lSigpipe);
    sigaddset(&lSigpipe, SIGPIPE);
    pthread_sigmask(SIG_BLOCK, &lSigpipe, nullptr);
    const std::string lResponsePath = mDirectory + gcResponseFifoName;
    while (!mResponseFifo.isOpen()) {
        mResponseFifo = ZTCFileDescriptor::open(lResponsePath.c_str(), O_WRONLY | O_NONBLOCK);
        pollfd lStop{mStop.get(), POLLIN, 0};
        if (!mResponseFifo.isOpen() && poll(&lStop, 1, 2) > 0) {
            return;
        }
    }
    while (!mIsDead) {
        ZTCWireBytes lHeader;
        ZTCWireBytes lBody;
        if (!readExactly(lHeader, 4)) {
            break;
        }
        std::size_t lLength = 0;
        for (const std::uint8_t lByte : lHeader) {
            lLength = lLength << 8 | lByte;
        }
        if (!readExactly(lBody, lLength)) {
            break;
        }
        if (lBody == encodeCollectionPeriod(0) && mRefusesPeriodOfZero) {
            sendFrame({1, 0, 6});
            continue;
        }
        {
            const std::lock_guard lLock(mMutex);
            mRequests.push_back(lBody);
        }
        const ZTCStep lStep = mSteps.front();
        if (mSteps.size() > 1) {
            mSteps.pop_front();
        }
        lStep(*this, lBody);
    }
    mCommandFifo.reset();
    mOwnCommandWriter.reset();
    mResponseFifo.reset();
    mPidFile.reset();
}

ZTCFakeAgent::ZTCStep ZTCFakeAgent::answering(const ZTCWireBytes& acrBody) {
    return [acrBody](ZTCFakeAgent& arAgent, const ZTCWireBytes&) { arAgent.sendFrame(acrBody); };
}

ZTCFakeAgent::ZTCStep ZTCFakeAgent::answeringRaw(const ZTCWireBytes& acrBytes) {
    return [acrBytes](ZTCFakeAgent& arAgent, const ZTCWireBytes&) { arAgent.sendRaw(acrBytes); };
}

ZTCFakeAgent::ZTCStep ZTCFakeAgent::answeringInHalves(const ZTCWireBytes& acrBody, std::shared_future<void> aGoOn) {
    return [lFrame = sMakeFrame(acrBody), lGoOn = std::move(aGoOn)](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
        const auto lMiddle = lFrame.begin() + std::ssize(lFrame) / 2;
        arAgent.sendRaw({lFrame.begin(), lMiddle});
        lGoOn.wait();
        arAgent.sendRaw({lMiddle, lFrame.end()});
    };
}

ZTCFakeAgent::ZTCStep ZTCFakeAgent::silent() {
    return [](ZTCFakeAgent&, const ZTCWireBytes&) {};
}

ZTCFakeAgent::ZTCStep ZTCFakeAgent::dying(const ZTCWireBytes& acrLastBytes) {
    return [acrLastBytes](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
        arAgent.sendRaw(acrLastBytes);
        arAgent.die();
    };
}
