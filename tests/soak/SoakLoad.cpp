#include "tests/soak/SoakLoad.h"

#include <unistd.h>

#include <csignal>
#include <stdexcept>
#include <string>

#include "tests/system/AdapterEvents.h"

ZTCSoakLoad::ZTCSoakLoad(ZTCAgentProcess& arAgent, unsigned aBoards) : mrAgent(arAgent) {
    for (unsigned lBoard = 0; lBoard <= aBoards; ++lBoard) {  // the last one is unknown
        for (const ZTSDataKind& lcrKind : dataKinds()) {
            mEvents.push_back(ZTSLibraryEvent::scope(lBoard, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData));
            for (const ZTCBytes& lcrOther : lcrKind.mOthers) {
                mEvents.push_back(ZTSLibraryEvent::scope(lBoard, lcrKind.mCategory, lcrKind.mSubcategory, lcrOther));
            }
            // Too short, and then without anything.
            mEvents.push_back(ZTSLibraryEvent::scope(lBoard, lcrKind.mCategory, lcrKind.mSubcategory, {1, 2, 3}));
        }
        for (const ZTSBareKind& lcrKind : bareKinds(lBoard)) {
            mEvents.push_back(lcrKind.mEvent);
        }
        mEvents.push_back(ZTSLibraryEvent::rscn(lBoard, rscnPayload({0x00010203, 0x00010204, 0x01020000})));
        mEvents.push_back(ZTSLibraryEvent::bare(lBoard, 77, 77));
    }
    for (unsigned lTarget = 0; lTarget < 64; ++lTarget) {
        mTargets.push_back({makeWwn(gcRemoteNode + lTarget), makeWwn(gcRemotePort + lTarget), 0x010200 + lTarget});
    }
}

void ZTCSoakLoad::command(const ZTCBytes& acrBody, const char* apAnswer) {
    const std::string lAnswer = hexOf(mrAgent.pipes().request(acrBody));
    ++mCounts.mCommands;
    if (lAnswer != apAnswer) {
        throw std::runtime_error("command " + hexOf(acrBody).substr(0, 20) + " was answered " + lAnswer);
    }
}

std::uint64_t ZTCSoakLoad::retrieve() {
    std::uint64_t lOccurrences = 0;
    for (const ZTSEncodedRecordList& lcrList : mrAgent.retrieve().mLists) {
        mCounts.mRecords += lcrList.mRecords.size();
        for (const ZTSEncodedRecord& lcrRecord : lcrList.mRecords) {
            lOccurrences += lcrRecord.mOccurrences;
        }
    }
    ++mCounts.mCommands;
    return lOccurrences;
}

void ZTCSoakLoad::reconnect() {
    mrAgent.pipes().close();
    mrAgent.pipes().open();
    ++mCounts.mReconnections;
}

void ZTCSoakLoad::sendBrokenFrame() {
    // Each with bytes behind its length: when they are gone, the agent throws away nothing any more that comes then.
    static const char* const slFrames[] = {"00000000 00", "ffffffff 0102030405", "7fffffff 00",
                                           "00000000 ffffffffffffffff"};
    mrAgent.pipes().sendRaw(bytesOf(slFrames[mRound % std::size(slFrames)]));
    mrAgent.pipes().waitUntilTaken();
    ++mCounts.mBrokenFrames;
}

/// With nothing else going on every event is in a record, once.
void ZTCSoakLoad::countExactly() {
    constexpr std::uint64_t lcThreads = 4;
    constexpr std::uint64_t lcRounds = 50;
    retrieve();
    mrAgent.library().startStorm(
        lcThreads, lcRounds,
        {ZTSLibraryEvent::scope(0, 4, 0x01, scsiData(gcRemotePort, 3)), ZTSLibraryEvent::temperature(1)});
    const std::uint64_t lDelivered = mrAgent.library().waitForStorm();
    const std::uint64_t lRetrieved = retrieve();
    mCounts.mEvents += lDelivered;
    if (lRetrieved != lDelivered) {
        throw std::runtime_error(std::to_string(lDelivered) + " events were delivered, " + std::to_string(lRetrieved) +
                                 " are in the records");
    }
}

void ZTCSoakLoad::playRound() {
    ++mRound;
    // The sensor's sign of life: touched for a while, and then there, for its process is.
    if (mRound % 100 < 50) {
        writeFile(mrAgent.sensorPidFilePath(), std::to_string(::getpid()) + "\n");
    }
    command(ZTCAgentProcess::startScopeRequest(mRound % 2 == 0 ? 4096 : 256), gcSuccessHex);
    mrAgent.library().startStorm(6, 2, mEvents);
    retrieve();
    command(ZTCAgentProcess::registerTargetsRequest(mTargets), gcSuccessHex);
    command(bytesOf(gcStopScopeHex), gcSuccessHex);
    command(bytesOf(gcPingHex), gcInvalidHex);
    command(bytesOf("0300000000"), gcInvalidHex);
    command(ZTCAgentProcess::startScopeRequest(4096), gcSuccessHex);
    sendBrokenFrame();
    reconnect();
    retrieve();
    if (mRound % 8 == 0) {
        mrAgent.process().sendSignal(SIGHUP);
    }
    mCounts.mEvents += mrAgent.library().waitForStorm();
    countExactly();
    command(bytesOf("0500000001"), gcSuccessHex);
}
