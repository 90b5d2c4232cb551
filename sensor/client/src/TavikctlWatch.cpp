#include <poll.h>
#include <signal.h>
#include <sys/signalfd.h>

#include <algorithm>
#include <cerrno>
#include <nlohmann/json.hpp>

#include "sensor/client/include/AgentState.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/client/include/RecordTable.h"
#include "sensor/client/include/SensorPidFile.h"
#include "sensor/client/src/Tavikctl.h"

/// The pid file is touched at least this often, so that it moves in every heartbeat period that an agent can have.
static constexpr std::chrono::milliseconds scTouchPeriod{1000};

/// A descriptor that is readable once SIGINT, SIGTERM or SIGHUP has come.
static ZTCFileDescriptor sOpenStopSignals() {
    sigset_t lSignals;
    sigemptyset(&lSignals);
    sigaddset(&lSignals, SIGINT);
    sigaddset(&lSignals, SIGTERM);
    sigaddset(&lSignals, SIGHUP);
    sigprocmask(SIG_BLOCK, &lSignals, nullptr);
    ZTCFileDescriptor lDescriptor(signalfd(-1, &lSignals, SFD_CLOEXEC | SFD_NONBLOCK));
    if (!lDescriptor.isOpen()) {
        throw ZTCSystemCallEx("cannot wait for signals", errno);
    }
    return lDescriptor;
}

class ZTCWatch {
public:
    ZTCWatch(const ZTSToolOptions& acrOptions, const ZTSWatchOptions& acrWatch)
        : mrOptions(acrOptions),
          mrWatch(acrWatch),
          mStopSignals(sOpenStopSignals()),
          mPidFile(acrOptions.mDirectory),
          mClient(acrOptions.mDirectory, acrOptions.mTimeout, mStopSignals.get()) {}

    ZTEExitStatus run() {
        auto lNext = std::chrono::steady_clock::now();
        bool lIsStart = true;
        while (waitUntil(lNext)) {
            bool lWasAnswered;
            try {
                lWasAnswered = tryCycle(lIsStart);
            } catch (const ZTCCancelledEx&) {
                break;
            }
            if (mHasUnprinted) {
                break;
            }
            if (mRetrievals == mrWatch.mCount && mrWatch.mCount != 0) {
                break;
            }
            const auto lNow = std::chrono::steady_clock::now();
            lNext = lWasAnswered ? std::max(lNext + mrWatch.mInterval, lNow)
                                 : lNow + std::min(mrWatch.mInterval, scTouchPeriod);
            lIsStart = lIsStart && !lWasAnswered;
        }
        return mStatus;
    }

private:
    /// False when a stop signal came first.
    bool waitUntil(std::chrono::steady_clock::time_point aTime) {
        while (true) {
            mPidFile.touch();
            const auto lLeft = std::chrono::ceil<std::chrono::milliseconds>(aTime - std::chrono::steady_clock::now());
            const auto lPause = std::clamp(lLeft, std::chrono::milliseconds{0}, scTouchPeriod);
            pollfd lStop{.fd = mStopSignals.get(), .events = POLLIN, .revents = 0};
            if (poll(&lStop, 1, static_cast<int>(lPause.count())) > 0) {
                return false;
            }
            if (lLeft <= std::chrono::milliseconds{0}) {
                return true;
            }
        }
    }

    /// The first cycle of a run only starts the collection; the others retrieve too.
    bool tryCycle(bool aIsStart) {
        try {
            mClient.connect();
            startWhereNeeded();
            if (!aIsStart) {
                retrieve();
            }
            mClient.disconnect();
            reportLateAnswers();
        } catch (const ZTCNoAnswerEx& lrEx) {
            mHasStarted = mHasStarted && (lrEx.getReason() == ZTNA_LockHeld || lrEx.getReason() == ZTNA_Silence);
            if (!mIsOutage) {
                complain(std::string(lrEx.what()) + "; trying on");
            }
            mIsOutage = true;
            reportLateAnswers();
            return false;
        }
        if (mIsOutage) {
            complain("the agent in " + mrOptions.mDirectory + " answers");
        }
        mIsOutage = false;
        return true;
    }

    /// A new agent has no targets and collects nothing. It is known by its pid, which stands in its file before it
    /// listens.
    void startWhereNeeded() {
        if (mHasStarted && lookAtAgent(mrOptions.mDirectory).mPid == mAgentPid) {
            return;
        }
        mHasStarted = false;
        if (!mrWatch.mTargets.empty()) {
            note(reportAnswer(mrOptions, "targets", mClient.registerTargets(mrWatch.mTargets)));
        }
        note(reportAnswer(mrOptions, "start", mClient.startScope(mrWatch.mMaxRecordBytes)));
        mAgentPid = lookAtAgent(mrOptions.mDirectory).mPid;
        mHasStarted = true;
    }

    void retrieve() {
        const ZTSAnswer lAnswer = mClient.getScopeData();
        ++mRetrievals;
        print(lAnswer, "retrieval " + std::to_string(mRetrievals), mRetrievals);
        note(reportAnswer(mrOptions, "get", lAnswer));
        if (mClient.getDiscardedBytes() != mReportedDiscards) {
            complain("threw away " + std::to_string(mClient.getDiscardedBytes() - mReportedDiscards) +
                     " bytes of an earlier answer that was not read");
            mReportedDiscards = mClient.getDiscardedBytes();
        }
    }

    void reportLateAnswers() {
        for (const ZTSAnswer& lrAnswer : mClient.takeLateAnswers()) {
            complain("got the late answer of an earlier request");
            if (lrAnswer.getResponse().mOutcome == ZTRO_ScopeData) {
                print(lrAnswer, "late answer", 0);
            }
        }
    }

    void print(const ZTSAnswer& acrAnswer, const std::string& acrTitle, std::uint64_t aRetrieval) {
        const ZTSResponse& lrResponse = acrAnswer.getResponse();
        if (mrOptions.mIsJson) {
            nlohmann::ordered_json lDocument{{"command", "watch"}, {"retrieval", aRetrieval}};
            lDocument.update(toJson(lrResponse));
            write(lrResponse, dumpJson(lDocument, -1) + "\n");
        } else {
            write(lrResponse, "-- " + acrTitle + "\n" + formatTable(lrResponse, lrResponse.countRecords() != 0));
        }
    }

    /// A reader that has stopped keeps neither the pid file from being touched nor a signal from ending the watch.
    void write(const ZTSResponse& acrResponse, const std::string& acrText) {
        if (mHasUnprinted || !writeOutputPatiently(acrText, [this] { return waitUntil({}); })) {
            mHasUnprinted = true;
            note(ZTXS_LocalFailure);
            complain(
                "ended by a signal while nobody read standard output: " + std::to_string(acrResponse.countRecords()) +
                " records were taken from the agent and could not be printed in full");
        }
    }

    void note(ZTEExitStatus aStatus) { mStatus = std::max(mStatus, aStatus); }

    const ZTSToolOptions& mrOptions;
    const ZTSWatchOptions& mrWatch;
    const ZTCFileDescriptor mStopSignals;
    ZTCSensorPidFile mPidFile;
    ZTCSensorClient mClient;
    ZTEExitStatus mStatus = ZTXS_Done;
    std::uint64_t mRetrievals = 0;
    std::uint64_t mReportedDiscards = 0;
    bool mHasStarted = false;
    long mAgentPid = 0;
    bool mIsOutage = false;
    bool mHasUnprinted = false;  ///< a signal came while the reader of standard output did not read
};

ZTEExitStatus runWatch(const ZTSToolOptions& acrOptions, const ZTSWatchOptions& acrWatch) {
    return ZTCWatch(acrOptions, acrWatch).run();
}
