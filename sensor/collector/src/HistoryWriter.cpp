#include "sensor/collector/include/HistoryWriter.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <map>
#include <nlohmann/json.hpp>
#include <sstream>

#include "sensor/collector/include/PageCounts.h"
#include "sensor/collector/include/SpoolRecovery.h"
#include "sensor/metrics/include/Metrics.h"

/// Name of the store's value with the generations that were seen running and not yet ended, a blank behind each.
static constexpr const char* scRunningValue = "collector.generations";
/// The same with the time when a frame was last taken in: microseconds since the epoch.
static constexpr const char* scLastTakenValue = "collector.lastTaken";
/// The same with the generation of the last agent whose start was counted.
static constexpr const char* scCountedValue = "collector.countedGeneration";

ZTCHistoryWriter::ZTCHistoryWriter(ZTCStore& arStore, const ZTCSpool& acrSpool, Report aReport)
    : mrStore(arStore), mrSpool(acrSpool), mReport(std::move(aReport)) {
    mrStore.setAddressResolver(
        [this](const ZTSFcName& acrInitiator, std::uint32_t aFcId) { return resolve(acrInitiator, aFcId); });
}

ZTCHistoryWriter::~ZTCHistoryWriter() {
    mrStore.setAddressResolver(nullptr);
}

void ZTCHistoryWriter::closeEpisodes() {
    mrStore.closeEpisodes(getHistoryTime(), [this](const ZTSInitiator& acrInitiator, ZTCKindKey aKind) {
        return mpPage == nullptr || holdsNothing(*mpPage, acrInitiator, aKind);
    });
}

void ZTCHistoryWriter::storePage(const ZTCPagePointer& acrPage) {
    const std::vector<ZTSPageCounts> lCounts = toPageCounts(*acrPage);
    mrStore.noteLedger(acrPage->mStartId, lCounts);
    storeLibraryLosses(*acrPage);
    mpPage = acrPage;
}

/// The library counts from its start on; the history over all starts. Pages of one agent come in order, and those of
/// the next behind them.
void ZTCHistoryWriter::storeLibraryLosses(const ZTSStatusSnapshot& acrPage) {
    if (acrPage.mLosses.empty()) {
        return;
    }
    const std::string lStored = mrStore.getValue(gcLibraryLossesValue);
    nlohmann::json lValue = nlohmann::json::parse(lStored, nullptr, false);
    if (!lValue.is_object()) {
        lValue = nlohmann::json::object();
    }
    if (lValue.value("generation", "") != acrPage.mStartId) {
        lValue["generation"] = acrPage.mStartId;
        lValue["last"] = nlohmann::json::object();
    }
    std::map<std::string, std::uint64_t> lNow;
    for (const ZTSStatusLossCopy& lrLoss : acrPage.mLosses) {
        lNow[lrLoss.mName] += lrLoss.mTotal;
    }
    for (const auto& [lName, lCount] : lNow) {
        nlohmann::json& lrTotal = lValue["total"][lName];
        const std::uint64_t lLast = lValue["last"].value(lName, std::uint64_t{0});
        lrTotal = (lrTotal.is_number() ? lrTotal.get<std::uint64_t>() : 0) + (lCount > lLast ? lCount - lLast : 0);
        lValue["last"][lName] = std::max(lCount, lLast);
    }
    // A name has any bytes: what is no UTF-8 is replaced.
    const std::string lText = lValue.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
    if (lText != lStored) {
        mrStore.setValue(gcLibraryLossesValue, lText);
    }
}

void ZTCHistoryWriter::setAside(const ZTSSpoolName& acrName, const std::string& acrReason) {
    const std::string lPath = mrSpool.pathOf(acrName);
    mReport(acrReason + ": it is set aside as " + lPath + ".unreadable, and a gap is written");
    rename(lPath.c_str(), (lPath + ".unreadable").c_str());
    ZTSGap lGap;
    lGap.mFrom = lGap.mTo = getHistoryTime();
    lGap.mReason = "a spooled response cannot be read: " + acrName.toText();
    lGap.mGeneration = acrName.mGeneration;
    mrStore.noteGap(lGap);
}

std::optional<std::uint64_t> ZTCHistoryWriter::takeIn(const ZTSSpoolEntry& acrEntry, const ZTCPagePointer& acrPage,
                                                      bool aIsLastTry) {
    const ZTSSpoolName& lrName = acrEntry.mName;
    std::optional<std::uint64_t> lRecords;
    if (!mrStore.hasFrame(lrName.mNumber)) {
        std::vector<std::uint8_t> lBytes;
        try {
            lBytes = mrSpool.read(lrName);
        } catch (const ZTCSpoolTroubleEx& lrEx) {
            if (!aIsLastTry && lrEx.getErrno() != ENOENT) {
                throw;
            }
            setAside(lrName, lrEx.what());
            return std::nullopt;
        }
        const ZTSSpooledBody lBody = readSpooledBody(lBytes);
        const ZTSTakenIn lTaken = mrStore.takeIn(lrName.mNumber, lrName.mGeneration, lBody.mBody,
                                                 lrName.mState == ZTSPS_Torn || !lBody.isWhole(), getHistoryTime());
        if (!lTaken.mProblem.empty()) {
            mReport(mrSpool.pathOf(lrName) + ": " + lTaken.mProblem + "; its " + std::to_string(lTaken.mRecords) +
                    " whole records are stored");
        }
        mrStore.setValue(scLastTakenValue, std::to_string(toMicroseconds(getHistoryTime())));
        lRecords = lTaken.mRecords;
    }
    if (acrPage != nullptr) {
        storePage(acrPage);
    } else if (lrName.mState == ZTSPS_Torn && !mrStore.hasEnded(lrName.mGeneration)) {
        noteSeen(lrName.mGeneration);  // a gap is due, also where this history has not heard of that agent
    }
    return lRecords;
}

void ZTCHistoryWriter::notePage(const ZTCPagePointer& acrPage) {
    noteSeen(acrPage->mStartId);
    countStart(acrPage->mStartId);
    storePage(acrPage);
    const std::vector<ZTSKindStateNow> lStates = toKindStates(*acrPage);
    mrStore.noteCoverage(getHistoryTime(), lStates);
    closeEpisodes();
}

void ZTCHistoryWriter::endAgent(const ZTSEndedAgent& acrAgent) {
    if (acrAgent.mpPage != nullptr) {
        storePage(acrAgent.mpPage);
    }
    if (mrStore.endAgent(acrAgent.mGeneration, acrAgent.mFrom, acrAgent.mTo, acrAgent.mIsVanished, acrAgent.mReason,
                         acrAgent.mpPage != nullptr)) {
        mReport("a gap is in the history: " + acrAgent.mReason);
    }
    if (mpPage != nullptr && mpPage->mStartId == acrAgent.mGeneration) {
        mpPage = nullptr;
        mrStore.noteCoverage(acrAgent.mTo, {});
    }
    noteEnded(acrAgent.mGeneration);
    closeEpisodes();
}

void ZTCHistoryWriter::noteSeen(const std::string& acrGeneration) {
    const std::string lRunning = mrStore.getValue(scRunningValue);
    if (lRunning.find(acrGeneration + " ") == std::string::npos) {
        mrStore.setValue(scRunningValue, lRunning + acrGeneration + " ");
    }
}

/// Counts the agents that were started, each once: a collector that is new meets the running one again.
void ZTCHistoryWriter::countStart(const std::string& acrGeneration) {
    if (mrStore.getValue(scCountedValue) == acrGeneration) {
        return;
    }
    std::uint64_t lRestarts = 0;
    std::istringstream(mrStore.getValue(gcAgentRestartsValue)) >> lRestarts;
    lRestarts += mrStore.getValue(scCountedValue).empty() ? 0 : 1;  // the first start of all is no restart
    mrStore.setValue(gcAgentRestartsValue, std::to_string(lRestarts));
    mrStore.setValue(scCountedValue, acrGeneration);
}

void ZTCHistoryWriter::noteEnded(const std::string& acrGeneration) {
    std::string lRunning = mrStore.getValue(scRunningValue);
    const std::size_t lAt = lRunning.find(acrGeneration + " ");
    if (lAt != std::string::npos) {
        mrStore.setValue(scRunningValue, lRunning.erase(lAt, acrGeneration.size() + 1));
    }
}

void ZTCHistoryWriter::endForgottenAgents(const std::string& acrRunningGeneration) {
    std::istringstream lRunning(mrStore.getValue(scRunningValue));
    std::int64_t lLastTaken = 0;
    std::istringstream(mrStore.getValue(scLastTakenValue)) >> lLastTaken;
    const ZTCHistoryTime lFrom = lLastTaken == 0 ? getHistoryTime() : fromMicroseconds(lLastTaken);
    std::string lGeneration;
    while (lRunning >> lGeneration) {
        if (lGeneration != acrRunningGeneration) {
            ZTSEndedAgent lAgent;
            lAgent.mGeneration = lGeneration;
            lAgent.mTo = getHistoryTime();
            lAgent.mFrom = lFrom;
            lAgent.mIsVanished = true;
            lAgent.mReason = "the agent vanished without a trace: the host went down, or its directory was removed";
            endAgent(lAgent);
        }
    }
}

void ZTCHistoryWriter::notePorts(std::shared_ptr<const ZTSTopology> apPorts) {
    for (const ZTSTopologyInitiator& lrPort : apPorts->mInitiators) {
        if (lrPort.mWwpn) {
            mrStore.noteInitiator({.mWwpn = lrPort.mWwpn, .mWwnn = lrPort.mWwnn, .mHost = lrPort.mHost});
        }
    }
    for (const ZTSTopologyRemotePort& lrPort : apPorts->mRemotePorts) {
        if (lrPort.mWwpn) {
            mrStore.noteRemotePort({.mWwpn = *lrPort.mWwpn, .mWwnn = lrPort.mWwnn, .mFcId = lrPort.mFcId});
        }
    }
    mpPorts = std::move(apPorts);
}

/// The remote port that has the address now, seen from the initiator. Well-known addresses have none.
std::optional<ZTSRemotePort> ZTCHistoryWriter::resolve(const ZTSFcName& acrInitiator, std::uint32_t aFcId) const {
    if (mpPorts == nullptr) {
        return std::nullopt;
    }
    const auto lpHost = std::ranges::find(mpPorts->mInitiators, acrInitiator, &ZTSTopologyInitiator::mWwpn);
    for (const ZTSTopologyRemotePort& lrPort : mpPorts->mRemotePorts) {
        if (lpHost != mpPorts->mInitiators.end() && lrPort.mHost == lpHost->mHost && lrPort.mFcId == aFcId &&
            lrPort.mWwpn) {
            return ZTSRemotePort{.mWwpn = *lrPort.mWwpn, .mWwnn = lrPort.mWwnn, .mFcId = aFcId};
        }
    }
    return std::nullopt;
}
