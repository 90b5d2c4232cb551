// fill-day DIRECTORY SYSFS: the day that scripts/demo tells in half a minute, at its hours: it begins at 08:00, and
// 18:20 is now. The ports are those of scenarios/day.kpm, SYSFS is the tree of scripts/lib/demo-sysfs.

#include <algorithm>
#include <cstdio>
#include <exception>
#include <vector>

#include "sensor/store/include/Store.h"
#include "sensor/topology/include/TopologyScan.h"
#include "tests/unit/store/Frames.h"

namespace {

constexpr std::uint64_t scAdapters[] = {0x3000000000010000, 0x3000000000010001};
constexpr std::uint64_t scArray7A0 = 0x3000000000020000, scArray7A1 = 0x3000000000020001;
constexpr std::uint64_t scArray7B0 = 0x3000000000020002, scArray7B1 = 0x3000000000020003;
constexpr std::uint64_t scArray9P0 = 0x3000000000040000, scArray9P1 = 0x3000000000040001, scTape = 0x3000000000030000;
constexpr int scMinutesBefore = 620;  ///< from 08:00 to 18:20

struct ZTSPlanned {
    std::size_t mAdapter = 0;
    ZTSTestRecord mRecord;
};

class ZTCDay {
public:
    ZTCDay(ZTCStore& arStore, std::int64_t aNow) : mrStore(arStore), mNow(aNow) {}

    void fill(const char* apSysfs) {
        begin();
        plan();
        std::ranges::stable_sort(mPlanned, {}, [](const ZTSPlanned& acrOne) { return acrOne.mRecord.mEnd; });
        for (const ZTSPlanned& lrPlanned : mPlanned) {
            take(lrPlanned);
        }
        noteTopology(apSysfs);
        inTransaction([this] {
            mrStore.setMark("before-zoning", time(13, 55));
            mrStore.closeEpisodes(fromMicroseconds(mNow), [](const ZTSInitiator&, ZTCKindKey) { return true; });
            mrStore.endRun(fromMicroseconds(mNow));
        });
    }

private:
    /// A time of the day.
    std::int64_t at(int aHour, int aMinute) const {
        return mNow - (scMinutesBefore - (aHour - 8) * 60 - aMinute) * gcMinute;
    }
    ZTCHistoryTime time(int aHour, int aMinute) const { return fromMicroseconds(at(aHour, aMinute)); }

    template <typename F>
    void inTransaction(const F& acrDo) {
        ZTCStoreTransaction lTransaction = mrStore.begin();
        acrDo();
        lTransaction.commit();
    }

    void begin() {
        inTransaction([this] {
            mrStore.beginRun(time(8, 0));
            for (std::size_t i = 0; i < 2; ++i) {
                mrStore.noteInitiator(
                    {.mWwpn = makeName(scAdapters[i]), .mWwnn = {}, .mHost = "host" + std::to_string(7 + i)});
            }
            mrStore.noteCoverage(time(8, 0), states(ZTKST_Listening));
        });
    }

    std::vector<ZTSKindStateNow> states(ZTEKindState aState) const {
        std::vector<ZTSKindStateNow> lStates;
        for (const std::uint64_t lAdapter : scAdapters) {
            for (const ZTCKindKey lKind : {gcQueueFull, gcLink, gcRscn, gcCheckCondition, gcLogo}) {
                lStates.push_back({.mWwpn = makeName(lAdapter), .mWwnn = {}, .mKind = lKind, .mState = aState});
            }
        }
        return lStates;
    }

    void add(std::size_t aAdapter, ZTCKindKey aKind, const ZTCBytes& acrData, std::int64_t aTime,
             std::uint32_t aCount = 1) {
        ZTSTestRecord lRecord;
        lRecord.mKind = aKind;
        lRecord.mData = acrData;
        lRecord.mBegin = aTime;
        lRecord.mEnd = aTime + (aCount == 1 ? 0 : 50 * gcSecond);
        lRecord.mOccurrences = aCount;
        mPlanned.push_back({aAdapter, lRecord});
    }

    void plan() {
        for (std::size_t i = 0; i < 2; ++i) {
            add(i, gcLink, makeGenericData(), at(8, 0), 2);
        }
        for (const std::uint64_t lPort : {scArray7A0, scArray7B0, scArray9P0, scTape}) {
            add(0, gcPlogi, makeTwoNamesData(lPort, lPort), at(8, 0));
        }
        for (const std::uint64_t lPort : {scArray7A1, scArray7B1, scArray9P1}) {
            add(1, gcPlogi, makeTwoNamesData(lPort, lPort), at(8, 0));
        }
        for (int lFlap = 0; lFlap < 8; ++lFlap) {  // a bad cable
            add(1, gcLink, makeGenericData(), at(8, 12 + 4 * lFlap), 2);
        }
        planOverload();
        add(1, gcRscn, makeRscnData(0x020200), at(14, 0));
        add(1, gcLogo, makeTwoNamesData(scArray7B1, scArray7B1), at(14, 0));
        for (int lReset = 0; lReset < 6; ++lReset) {
            add(0, gcLunReset, makeResetData(scArray9P0, {5}), at(16, 45 + 7 * lReset));
            add(0, gcCheckCondition, makeCheckConditionData(scArray9P0, 6, 0x29, {5}, {0x28, 0x2a}, {3}),
                at(16, 46 + 7 * lReset), 2);
        }
    }

    /// Backup meets month-end at 11:30; at 18:00 comes a storm.
    void planOverload() {
        const std::uint32_t lShares[] = {300, 900, 2100, 3600, 2700, 1500, 600, 300};
        for (int i = 0; i < 8; ++i) {
            add(0, gcQueueFull, makeBusyData(scArray7A0, {0, 1, 2, 3}), at(11, 30 + 6 * i), lShares[i]);
            add(1, gcQueueFull, makeBusyData(scArray7A1, {0, 1, 2, 3}), at(11, 30 + 6 * i), lShares[i] * 2 / 3);
            add(0, gcQueueDepth, makeQueueDepthData(scArray7A0, {{32U >> (i / 2), 1}}), at(11, 33 + 6 * i));
            add(0, gcDeviceBusy, makeBusyData(scArray7A0, {0, 1}), at(11, 31 + 6 * i), 5);
        }
        for (int lMinute = 0; lMinute < 20; ++lMinute) {
            add(0, gcQueueFull, makeBusyData(scArray7A0, {0, 1, 2, 3}), at(18, lMinute), 10000);
            add(1, gcQueueFull, makeBusyData(scArray7A1, {0, 1, 2, 3}), at(18, lMinute), 10000);
        }
    }

    void take(const ZTSPlanned& acrPlanned) {
        inTransaction([&] {
            const ZTCHistoryTime lNow = fromMicroseconds(acrPlanned.mRecord.mEnd);
            mrStore.takeIn(mrStore.getLastFrame() + 1, "00000000000000a1",
                           makeBody({acrPlanned.mRecord}, scAdapters[acrPlanned.mAdapter]), false, lNow);
            mrStore.closeEpisodes(lNow, [](const ZTSInitiator&, ZTCKindKey) { return true; });
            mrStore.noteRunning(lNow);
        });
    }

    /// The second adapter's link flaps from 08:12 on, and counts errors; at 14:00 it loses a port of array7.
    void noteTopology(const char* apSysfs) {
        ZTCPatientReader lReader;
        ZTSTopologyRoots lRoots;
        lRoots.mSysfs = apSysfs;
        lRoots.mProcfs = lRoots.mSysfs + "/proc";
        ZTSTopology lTopology = scanTopology(lRoots, lReader);
        const auto lNote = [&](std::int64_t aTime) { inTransaction([&] { mrStore.noteTopology(aTime, lTopology); }); };
        lNote(at(8, 0));
        for (int lFlap = 0; lFlap < 8; ++lFlap) {
            lTopology.mInitiators.back().mState = "Linkdown";
            lNote(at(8, 12 + 4 * lFlap));
            lTopology.mInitiators.back().mState = "Online";
            lNote(at(8, 14 + 4 * lFlap));
        }
        for (ZTSTopologyRemotePort& lrPort : lTopology.mRemotePorts) {
            if (lrPort.mWwpn == makeName(scArray7B1)) {
                lrPort.mState = "Not Present";
            }
        }
        lNote(at(14, 0));
        std::vector<ZTSCounterSample> lSamples;
        for (int lMinute = 5; lMinute < 45; ++lMinute) {
            for (const char* lpCounter : {"invalid_crc_count", "loss_of_sync_count"}) {
                lSamples.push_back(
                    {.mMinute = at(8, lMinute),
                     .mInitiator = makeName(scAdapters[1]),
                     .mRemotePort = {},
                     .mCounter = lpCounter,
                     .mDifference = static_cast<std::uint64_t>(1 + lMinute * (*lpCounter == 'i' ? 7 : 2) % 23)});
            }
        }
        inTransaction([&] { mrStore.noteCounters(lSamples); });
    }

    ZTCStore& mrStore;
    const std::int64_t mNow;
    std::vector<ZTSPlanned> mPlanned;
};

}  // namespace

int main(int aCount, char** apArguments) {
    if (aCount != 3) {
        std::fprintf(stderr, "usage: fill-day DIRECTORY SYSFS\n");
        return 2;
    }
    try {
        ZTCStore lStore(apArguments[1], {},
                        [](const std::string& acrLine) { std::fprintf(stderr, "%s\n", acrLine.c_str()); });
        ZTCDay(lStore, toMicroseconds(getHistoryTime()) / gcMinute * gcMinute).fill(apArguments[2]);
    } catch (const std::exception& lrEx) {
        std::fprintf(stderr, "fill-day: %s\n", lrEx.what());
        return 1;
    }
    return 0;
}
