/// A collector for the keeper's tests: it starts the agent's collection, answers the keeper, and writes down what it is
/// told. It keeps nothing of what the agent hands over.
///
/// FAKE_COLLECTOR_DIR names a folder. `messages` in it gets a line for each message. Files that a test puts there
/// change what it does: `die` (it ends with status 3 at its start), `mute` (it never asks the agent), `no-look` (it
/// sends no Look), `silent` (it says once that the agent is silent, and removes the file), `refuse-finish` (it ignores
/// Finish).
#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <string>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/CommandEncoder.h"
#include "sensor/link/include/Inheritance.h"
#include "tests/support/TemporaryDirectory.h"

static constexpr int scTurnMilliseconds = 50;

class ZTCFakeCollector {
public:
    explicit ZTCFakeCollector(std::string aFolder)
        : mFolder(std::move(aFolder)),
          mInheritance(takeInheritance()),
          mAgentFolder(mInheritance.mDirectory + "/agent") {
        write("Collector " + std::to_string(getpid()));
    }

    int run() {
        if (has("die")) {
            return 3;
        }
        while (!mIsFinished) {
            pollfd lLink{.fd = mInheritance.mLink.getDescriptor(), .events = POLLIN, .revents = 0};
            poll(&lLink, 1, scTurnMilliseconds);
            ZTSLinkMessage lMessage;
            ZTELinkResult lResult;
            while ((lResult = mInheritance.mLink.receive(lMessage)) == ZTLR_Done) {
                handle(lMessage);
            }
            if (lResult == ZTLR_PeerGone) {
                write("KeeperGone");
                return 0;
            }
            turn();
        }
        write("Finished");
        return 0;
    }

private:
    bool has(const char* apName) const { return exists(mFolder + "/" + apName); }

    void write(const std::string& acrLine) {
        const ZTCFileDescriptor lFile =
            ZTCFileDescriptor::open((mFolder + "/messages").c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
        const std::string lLine = acrLine + "\n";
        if (::write(lFile.get(), lLine.data(), lLine.size()) < 0) {
            std::perror("fake collector");
        }
    }

    void tell(ZTELinkMessageType aType, std::uint64_t aStart = 0) {
        ZTSLinkMessage lMessage;
        lMessage.mType = aType;
        lMessage.mStart = aStart;
        mInheritance.mLink.send(lMessage);
    }

    void handle(ZTSLinkMessage& arMessage) {
        const std::string lStart = std::to_string(arMessage.mStart);
        switch (arMessage.mType) {
            case ZTLM_AgentStarted:
                write("AgentStarted " + lStart + " pid=" + std::to_string(arMessage.mPid) +
                      " restarts=" + std::to_string(arMessage.mRestarts) + " page=" + arMessage.mText);
                mAgent = std::move(arMessage);
                mHasStarted = false;
                break;
            case ZTLM_AgentEnded:
                write("AgentEnded " + lStart + " status=" + std::to_string(arMessage.mWaitStatus));
                unlink(arMessage.mText.c_str());
                mAgent.reset();
                tell(ZTLM_Drained, arMessage.mStart);
                break;
            case ZTLM_KeeperState:
                write(std::string("KeeperState ") + keeperStateName(arMessage.mState) + " " + arMessage.mText);
                break;
            case ZTLM_StopAgent:
                write("StopAgent " + lStart);
                shutDown();
                break;
            case ZTLM_Finish:
                write("Finish");
                mMustFinish = !has("refuse-finish");
                if (mMustFinish) {
                    shutDown();
                }
                break;
            case ZTLM_Reload:
                write("Reload " + std::to_string(readWhole(arMessage.mSettings).size()));
                break;
            default:
                write("Unexpected");
        }
    }

    void turn() {
        if (mAgent && !mHasStarted && !has("mute") && ask(encodeStartScope(900))) {
            mHasStarted = true;
            tell(ZTLM_StartAnswered, mAgent->mStart);
            write("StartAnswered " + std::to_string(mAgent->mStart));
        }
        if (mAgent && has("silent")) {
            unlink((mFolder + "/silent").c_str());
            tell(ZTLM_Silent, mAgent->mStart);
        }
        if (!has("no-look")) {
            tell(ZTLM_Look);
        }
        mIsFinished = mMustFinish && !mAgent;
    }

    void shutDown() {
        if (mAgent && !has("mute")) {
            ask(encodeStop());
            ask(encodeGetScopeData());
            ask(encodeShutDown());
        }
    }

    /// Whether an answer came. The agent may not be listening yet.
    bool ask(const ZTCWireBytes& acrBody) {
        const ZTCFileDescriptor lFifo =
            ZTCFileDescriptor::open((mAgentFolder + gcCommandFifoName).c_str(), O_WRONLY | O_NONBLOCK);
        const ZTCWireBytes lFrame = makeRequestFrame(acrBody);
        if (!lFifo.isOpen() ||
            ::write(lFifo.get(), lFrame.data(), lFrame.size()) != static_cast<ssize_t>(lFrame.size())) {
            return false;
        }
        unsigned char lHeader[4];
        if (!readAll(lHeader, sizeof(lHeader))) {
            return false;
        }
        const std::size_t lLength = lHeader[0] * 16777216U + lHeader[1] * 65536U + lHeader[2] * 256U + lHeader[3];
        std::string lBody(lLength, '\0');
        return readAll(lBody.data(), lBody.size());
    }

    bool readAll(void* apPlace, std::size_t aCount) {
        std::size_t lHad = 0;
        while (lHad < aCount) {
            pollfd lFifo{.fd = mAgent->mResponseFifo.get(), .events = POLLIN, .revents = 0};
            if (poll(&lFifo, 1, 10000) <= 0) {
                return false;
            }
            const ssize_t lRead = read(lFifo.fd, static_cast<char*>(apPlace) + lHad, aCount - lHad);
            if (lRead <= 0) {
                return false;
            }
            lHad += static_cast<std::size_t>(lRead);
        }
        return true;
    }

    const std::string mFolder;
    ZTSInheritance mInheritance;
    const std::string mAgentFolder;
    std::optional<ZTSLinkMessage> mAgent;
    bool mHasStarted = false;
    bool mMustFinish = false;
    bool mIsFinished = false;
};

int main() {
    const char* lpFolder = std::getenv("FAKE_COLLECTOR_DIR");
    return lpFolder == nullptr ? 2 : ZTCFakeCollector(lpFolder).run();
}
