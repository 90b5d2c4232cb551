/// The collector's work with one start of the agent. It begins when the keeper reports the start, and ends when the
/// last byte that the agent wrote is in the spool.
///
/// In order: the page is opened, since its start id names the spool's files. What an earlier collector left of this
/// start's answers is completed. The targets are registered, the start command is sent, and then the schedule says when
/// to look and to ask. A stop sends the stop command, asks until nothing is held, and sends the shut-down. When the
/// agent has ended, its FIFO is emptied to its end, and the page that it left goes to the history.
///
/// Nothing waits. The owner polls the descriptors and calls step() when one is readable and when getNextStep() has
/// come. One thread.
#ifndef SENSOR_COLLECTOR_INCLUDE_AGENTSESSION_H
#define SENSOR_COLLECTOR_INCLUDE_AGENTSESSION_H

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "sensor/collector/include/AskSchedule.h"
#include "sensor/collector/include/HistorySink.h"
#include "sensor/collector/include/SpoolingConversation.h"
#include "sensor/collector/include/TargetBook.h"

struct ZTSSessionSettings {
    std::chrono::milliseconds mPeriod{5000};
    std::uint32_t mRecordLimit = 900;

    bool operator==(const ZTSSessionSettings&) const = default;
};

/// What the keeper said of the start.
struct ZTSAgentStart {
    std::uint64_t mStart = 0;
    pid_t mPid = 0;
    std::string mPagePath;
    ZTCFileDescriptor mResponseFifo;
    ZTCFileDescriptor mBell;
};

/// What has happened since the last call.
struct ZTSSessionEvents {
    std::uint64_t mLooks = 0;
    std::uint64_t mFrames = 0;  ///< put into the spool and handed to the history
    bool mIsStartAnswered = false;
    bool mIsSilent = false;
    std::vector<std::string> mLines;  ///< for the log
};

class ZTCAgentSession {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;

    /// @param arSpool, arHistory  outlive this object  @param aDirectory  the agent's
    ZTCAgentSession(ZTSAgentStart aStart, ZTCSpool& arSpool, ZTCHistorySink& arHistory, std::string aDirectory,
                    const ZTSSessionSettings& acrSettings, ZTCTime aNow);

    /// Does all that is due.
    void step(ZTCTime aNow);
    /// When step() is to be called at the latest.
    ZTCTime getNextStep() const { return mNextStep; }
    ZTSSessionEvents takeEvents() { return std::exchange(mEvents, {}); }

    /// To be polled for POLLIN; -1: not now.
    int getResponseFifo() const;
    int getBell() const { return mHasEnded ? -1 : mStart.mBell.get(); }
    /// poll() has reported the FIFO as hung up and without bytes: it is not polled again before the next step.
    void noteHangUp() { mIsHungUp = true; }
    /// The bell is readable.
    void noteBell(ZTCTime aNow);

    void setSettings(const ZTSSessionSettings& acrSettings, ZTCTime aNow);
    void offerTargets(const std::vector<ZTSTargetPort>& acrTargets, ZTCTime aNow);
    /// @param aPatience  how long a full disk may delay the shut-down
    void requestStop(ZTCTime aNow, std::chrono::milliseconds aPatience);
    void noteEnded(int aWaitStatus, ZTCTime aNow);

    std::uint64_t getStart() const { return mStart.mStart; }
    pid_t getPid() const { return mStart.mPid; }
    const std::string& getPagePath() const { return mStart.mPagePath; }
    bool hasEnded() const { return mHasEnded; }
    /// The agent has ended, and all it wrote is in the spool.
    bool isDrained() const { return mIsDrained; }
    /// The start id; empty while it is not known.
    const std::string& getGeneration() const { return mTalk.getGeneration(); }
    bool isStarted() const { return mIsStarted; }
    bool isStopping() const { return mStop != ZTSTP_None; }
    std::size_t countTargets() const { return mTargets.countRegistered(); }

    /// The page as last read; null: it cannot be read.
    const ZTCPagePointer& getPage() const { return mpPage; }
    /// The same, read now.
    const ZTCPagePointer& readPageNow() {
        readPage();
        return mpPage;
    }
    std::optional<ZTCHistoryTime> getLastAsked() const { return mLastAsked; }
    /// Why the spool takes nothing; empty: it does.
    const std::string& getDiskProblem() const { return mDiskProblem; }
    int getDiskErrno() const { return mDiskErrno; }

private:
    enum ZTEStop : std::uint8_t { ZTSTP_None, ZTSTP_Command, ZTSTP_Getting, ZTSTP_ShutDown, ZTSTP_Done };

    bool attach(ZTCTime aNow);
    void receive(ZTCTime aNow);
    void settle(const ZTSProgress& acrProgress, ZTCTime aNow);
    void settleAnswer(const ZTSRequestAnswer& acrAnswer, ZTCTime aNow);
    void watchSilence(ZTCTime aNow);
    void decide(ZTCTime aNow);
    void decideStop(ZTCTime aNow);
    void look(ZTCTime aNow);
    bool send(ZTERequest aRequest, const ZTCWireBytes& acrBody, ZTCTime aNow);
    void drain(ZTCTime aNow);
    void end();
    void readPage();
    void noteTrouble(const ZTCSpoolTroubleEx& acrEx, ZTCTime aNow);
    void noteNoTrouble();
    void scheduleNext(ZTCTime aAt) { mNextStep = std::min(mNextStep, aAt); }

    ZTSAgentStart mStart;
    ZTCSpool& mrSpool;
    ZTCHistorySink& mrHistory;
    ZTSSessionSettings mSettings;
    const ZTCTime mBegin;
    const ZTCHistoryTime mBeginTime;  ///< the same for the history
    ZTCSpoolingConversation mTalk;
    ZTCAskSchedule mSchedule;
    ZTCTargetBook mTargets;
    ZTCStatusPageReader mPageReader;
    ZTCPagePointer mpPage;
    bool mHasPage = false;      ///< the generation is the page's
    bool mHasToldPage = false;  ///< there is a line in the log: the page cannot be looked at

    ZTCTime mNextStep;
    ZTCTime mNotBefore{};  ///< of the next request: a try has failed
    ZTCTime mLastByte{};
    std::size_t mOffered = 0;
    bool mIsStarted = false;
    bool mIsHungUp = false;
    ZTEStop mStop = ZTSTP_None;
    ZTCTime mStopGivesUp{};
    bool mHasEnded = false;
    int mWaitStatus = 0;
    bool mIsDrained = false;
    std::optional<ZTCHistoryTime> mLastAsked;
    std::string mDiskProblem;
    int mDiskErrno = 0;
    ZTSSessionEvents mEvents;
};

#endif
