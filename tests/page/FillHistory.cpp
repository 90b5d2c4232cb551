// fill-history DIRECTORY EPISODES SYSFS: a history of 30 days up to now, with so many episodes of two initiators and
// twelve remote ports, an outage, a stretch in which a kind was not heard, and two marks. The same events each time;
// only the times move with the clock. Prints the seed of the events. ZT_TEST_SEED=N makes others.

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <exception>
#include <map>
#include <random>
#include <tuple>
#include <utility>
#include <vector>

#include "sensor/store/include/Store.h"
#include "sensor/topology/include/TopologyScan.h"
#include "tests/support/SeedChoice.h"
#include "tests/unit/store/Frames.h"

namespace {

constexpr std::array<std::uint64_t, 12> scPorts{0x500601603BA01234, 0x500601613BA01234, 0x500601683BA01234,
                                                0x500601693BA01234, 0x50000973F0119900, 0x50000973F0119904,
                                                0x50000973F0119908, 0x50000973F011990C, 0x2101001B32A90001,
                                                0x2101001B32A90002, 0x500104F000ABC001, 0x500104F000ABC002};
constexpr std::array<std::uint64_t, 2> scInitiators{gcLocalPort, gcOtherLocalPort};
constexpr int scDays = 30;
/// Records of one response.
constexpr std::size_t scFrameRecords = 400;

struct ZTSPlanned {
    ZTSTestRecord mRecord;
    std::size_t mInitiator = 0;
};

/// Whether a port has one of its bad hours: some ports have many, the last ones none.
bool isBadHour(std::size_t aPort, std::int64_t aTime) {
    const auto lHour = static_cast<std::uint64_t>(aTime / (60 * gcMinute));
    const std::uint64_t lMixed = (lHour / 3 * 2654435761U + aPort * 40503U) % 97;
    return aPort < 10 && lMixed < 30 / (1 + aPort / 2);
}

ZTSTestRecord makeLoad(std::mt19937& arRandom, std::uint64_t aPort) {
    const auto lLun = static_cast<unsigned>(arRandom() % 30);
    ZTSTestRecord lRecord;
    if (arRandom() % 3 == 0) {
        lRecord.mKind = gcDeviceBusy;
        lRecord.mData = makeBusyData(aPort, {lLun});
    } else {
        lRecord.mKind = gcQueueFull;
        lRecord.mData = makeBusyData(aPort, {lLun, lLun + 3});
    }
    lRecord.mOccurrences = 1U << arRandom() % 14;
    return lRecord;
}

/// What a port's bad hour is made of: load most of all, now and then something severe.
ZTSTestRecord makeTrouble(std::mt19937& arRandom, std::size_t aPort) {
    const std::uint64_t lPort = scPorts.at(aPort);
    const auto lDice = static_cast<unsigned>(arRandom() % 1000);
    ZTSTestRecord lRecord;
    if (lDice < 4 && aPort % 4 == 2) {
        lRecord.mKind = gcLunReset;
        lRecord.mData = makeResetData(lPort, {lDice});
    } else if (lDice < 12 && aPort % 3 == 1) {
        lRecord.mKind = gcLogo;
        lRecord.mData = makeTwoNamesData(lPort, lPort);
    } else if (lDice < 14) {
        lRecord.mKind = gcLink;
        lRecord.mData = makeGenericData();
    } else if (lDice < 250) {
        lRecord.mKind = gcCheckCondition;
        lRecord.mData = makeCheckConditionData(lPort, 6, 0x29, {lDice % 30}, {0x28}, {0});
        lRecord.mOccurrences = 1U << arRandom() % 6;
    } else {
        lRecord = makeLoad(arRandom, lPort);
    }
    return lRecord;
}

/// What happens at any time: sessions are verified, a queue depth changes.
ZTSTestRecord makeNews(std::mt19937& arRandom, std::uint64_t aPort) {
    ZTSTestRecord lRecord;
    if (arRandom() % 2 == 0) {
        lRecord.mKind = gcAdisc;
        lRecord.mData = makeTwoNamesData(aPort, gcNode);
    } else {
        lRecord.mKind = gcQueueDepth;
        lRecord.mData = makeQueueDepthData(aPort, {{16, 1}});
    }
    return lRecord;
}

/// By time. What would continue an episode of a short while ago is thrown again.
std::vector<ZTSPlanned> plan(unsigned aSeed, std::uint64_t aEpisodes, std::int64_t aFrom, std::int64_t aTo) {
    std::mt19937 lRandom(aSeed);
    std::map<std::tuple<std::size_t, std::size_t, ZTCKindKey>, std::int64_t> lFree;
    std::vector<ZTSPlanned> lPlanned;
    lPlanned.reserve(aEpisodes);
    const auto lStep = (aTo - aFrom) / static_cast<std::int64_t>(aEpisodes + 1);
    while (lPlanned.size() < aEpisodes) {
        const std::int64_t lTime = aFrom + static_cast<std::int64_t>(lPlanned.size()) * lStep;
        std::size_t lPort = lRandom() % 10;
        for (int lTries = 0; lTries < 8 && !isBadHour(lPort, lTime); ++lTries) {
            lPort = lRandom() % 10;
        }
        ZTSPlanned lOne{isBadHour(lPort, lTime) ? makeTrouble(lRandom, lPort) : makeNews(lRandom, scPorts.at(lPort)),
                        lRandom() % scInitiators.size()};
        lOne.mRecord.mBegin = lTime;
        lOne.mRecord.mEnd = lTime + static_cast<std::int64_t>(lRandom() % 50) * gcSecond;
        const bool lHasPort = lOne.mRecord.mKind != gcLink;
        std::int64_t& lrFree = lFree[{lOne.mInitiator, lHasPort ? lPort : scPorts.size(), lOne.mRecord.mKind}];
        if (lrFree < lTime) {
            lrFree = lOne.mRecord.mEnd + 2 * gcMinute;
            lPlanned.push_back(lOne);
        }
    }
    return lPlanned;
}

class ZTCFiller {
public:
    ZTCFiller(ZTCStore& arStore, std::int64_t aFrom) : mrStore(arStore), mFrom(aFrom) {}

    void begin() {
        ZTCStoreTransaction lTransaction = mrStore.begin();
        mrStore.beginRun(fromMicroseconds(mFrom));
        for (std::size_t i = 0; i < scInitiators.size(); ++i) {
            mrStore.noteInitiator(
                {.mWwpn = makeName(scInitiators.at(i)), .mWwnn = {}, .mHost = "host" + std::to_string(7 + i)});
        }
        for (const std::uint64_t lPort : scPorts) {
            mrStore.noteRemotePort({.mWwpn = makeName(lPort), .mWwnn = makeName(lPort & ~0xFFULL), .mFcId = {}});
        }
        noteStates(mFrom, ZTKST_Listening);
        lTransaction.commit();
    }

    /// One transaction for each response, as the collector does.
    void take(const std::vector<ZTSPlanned>& acrPlanned) {
        for (std::size_t lBegin = 0; lBegin < acrPlanned.size(); lBegin += scFrameRecords) {
            const std::size_t lEnd = std::min(lBegin + scFrameRecords, acrPlanned.size());
            const std::int64_t lNow = acrPlanned[lEnd - 1].mRecord.mEnd;
            ZTCStoreTransaction lTransaction = mrStore.begin();
            for (std::size_t lInitiator = 0; lInitiator < scInitiators.size(); ++lInitiator) {
                std::vector<ZTSTestRecord> lRecords;
                for (std::size_t i = lBegin; i < lEnd; ++i) {
                    if (acrPlanned[i].mInitiator == lInitiator) {
                        lRecords.push_back(acrPlanned[i].mRecord);
                    }
                }
                mrStore.takeIn(mrStore.getLastFrame() + 1, "00000000000000a1",
                               makeBody(lRecords, scInitiators.at(lInitiator)), false, fromMicroseconds(lNow));
            }
            mrStore.closeEpisodes(fromMicroseconds(lNow), [](const ZTSInitiator&, ZTCKindKey) { return true; });
            mrStore.noteRunning(fromMicroseconds(lNow));
            lTransaction.commit();
        }
    }

    /// Nothing is seen for eight hours.
    void pause(std::int64_t aFrom) {
        ZTCStoreTransaction lTransaction = mrStore.begin();
        mrStore.endRun(fromMicroseconds(aFrom));
        mrStore.beginRun(fromMicroseconds(aFrom + gcDay / 3));
        noteStates(aFrom + gcDay / 3, ZTKST_NoRights);
        noteStates(aFrom + gcDay / 3 + gcDay / 8, ZTKST_Listening);
        mrStore.setMark("firmware-9.1", fromMicroseconds(aFrom + gcDay / 3));
        mrStore.setMark("before-zoning", fromMicroseconds(aFrom + 10 * gcDay));
        lTransaction.commit();
    }

    /// The topology of a tree that looks like sysfs. One link was down for an hour of each sixth day, and its counters
    /// rose before. Since yesterday the remote ports have the states of the tree.
    void noteTopology(const std::string& acrSysfs, std::int64_t aNow) {
        ZTCPatientReader lReader;
        ZTSTopologyRoots lRoots;
        lRoots.mSysfs = acrSysfs;
        ZTSTopology lTopology = scanTopology(lRoots, lReader);
        std::vector<std::string> lStates;
        for (ZTSTopologyRemotePort& lrPort : lTopology.mRemotePorts) {
            lStates.push_back(std::exchange(lrPort.mState, "Online").value_or(""));
        }
        noteScan(mFrom, lTopology);
        for (std::int64_t lTime = mFrom + gcDay; lTime < aNow - gcDay; lTime += 6 * gcDay) {
            noteErrors(lTime - 60 * gcMinute, lTime);
            lTopology.mInitiators.back().mState = "Linkdown";
            noteScan(lTime, lTopology);
            lTopology.mInitiators.back().mState = "Online";
            noteScan(lTime + 60 * gcMinute, lTopology);
        }
        for (std::size_t i = 0; i < lStates.size(); ++i) {
            lTopology.mRemotePorts[i].mState = lStates[i];
        }
        noteScan(aNow - gcDay, lTopology);
        noteScan(aNow - gcMinute, lTopology);
    }

    void end(std::int64_t aNow) {
        ZTCStoreTransaction lTransaction = mrStore.begin();
        mrStore.endRun(fromMicroseconds(aNow));
        lTransaction.commit();
    }

private:
    void noteScan(std::int64_t aTime, const ZTSTopology& acrTopology) {
        ZTCStoreTransaction lTransaction = mrStore.begin();
        mrStore.noteTopology(aTime, acrTopology);
        lTransaction.commit();
    }
    void noteErrors(std::int64_t aFrom, std::int64_t aTo) {
        std::vector<ZTSCounterSample> lSamples;
        for (std::int64_t lMinute = aFrom; lMinute < aTo; lMinute += gcMinute) {
            for (const char* lpCounter : {"invalid_crc_count", "loss_of_sync_count"}) {
                lSamples.push_back({.mMinute = lMinute / gcMinute * gcMinute,
                                    .mInitiator = makeName(scInitiators[1]),
                                    .mRemotePort = {},
                                    .mCounter = lpCounter,
                                    .mDifference = static_cast<std::uint64_t>(1 + (lMinute - aFrom) / gcMinute)});
            }
        }
        ZTCStoreTransaction lTransaction = mrStore.begin();
        mrStore.noteCounters(lSamples);
        lTransaction.commit();
    }
    void noteStates(std::int64_t aTime, ZTEKindState aRscn) {
        std::vector<ZTSKindStateNow> lStates;
        for (const std::uint64_t lInitiator : scInitiators) {
            for (const ZTCKindKey lKind : {gcQueueFull, gcLink, gcCheckCondition}) {
                lStates.push_back(
                    {.mWwpn = makeName(lInitiator), .mWwnn = {}, .mKind = lKind, .mState = ZTKST_Listening});
            }
            lStates.push_back({.mWwpn = makeName(lInitiator), .mWwnn = {}, .mKind = gcRscn, .mState = aRscn});
        }
        mrStore.noteCoverage(fromMicroseconds(aTime), lStates);
    }

    ZTCStore& mrStore;
    const std::int64_t mFrom;
};

void fill(const char* apDirectory, std::uint64_t aEpisodes, const char* apSysfs) {
    const std::int64_t lNow = toMicroseconds(getHistoryTime()) / gcMinute * gcMinute;
    const std::int64_t lFrom = lNow - scDays * gcDay;
    const std::int64_t lOutage = lFrom + 12 * gcDay;
    ZTCStore lStore(apDirectory, {}, [](const std::string& acrLine) { std::fprintf(stderr, "%s\n", acrLine.c_str()); });
    ZTCFiller lFiller(lStore, lFrom);
    const unsigned lSeed = chooseSeed(gcPictureSeed);
    std::printf("%llu episodes with the seed %u\n", static_cast<unsigned long long>(aEpisodes), lSeed);
    lFiller.begin();
    lFiller.take(plan(lSeed, aEpisodes * 2 / 5, lFrom, lOutage));
    lFiller.pause(lOutage);
    lFiller.take(plan(lSeed, aEpisodes - aEpisodes * 2 / 5, lOutage + gcDay / 3, lNow - gcMinute));
    lFiller.noteTopology(apSysfs, lNow);
    lFiller.end(lNow);
}

}  // namespace

int main(int aCount, char** apArguments) {
    std::uint64_t lEpisodes = 0;
    if (aCount != 4 ||
        std::from_chars(apArguments[2], apArguments[2] + std::strlen(apArguments[2]), lEpisodes).ec != std::errc() ||
        lEpisodes < 10) {
        std::fprintf(stderr, "fill-history DIRECTORY EPISODES SYSFS: at least 10 episodes\n");
        return 2;
    }
    try {
        fill(apArguments[1], lEpisodes, apArguments[3]);
    } catch (const std::exception& lrEx) {
        std::fprintf(stderr, "fill-history: %s\n", lrEx.what());
        return 1;
    }
    return 0;
}
