/// A store that has rows in every table, of several days.
#ifndef TESTS_UNIT_STORE_FULLSTORE_H
#define TESTS_UNIT_STORE_FULLSTORE_H

#include <string>
#include <vector>

#include "tests/unit/store/StoreFixture.h"

class ZTCFullStoreTest : public ZTCStoreTest {
protected:
    /// What a collector stores in its life. Each day: a run that listens now and then, episodes that open, grow and
    /// close, a topology that changes, counters, a mark, and an agent that vanishes with what it held.
    void liveFor(unsigned aDays) {
        for (unsigned lDay = 0; lDay < aDays; ++lDay) {
            const std::int64_t lNow = gcBase + lDay * gcDay;
            const std::string lAgent = "agent" + std::to_string(lDay);
            inTransaction([&] { store().beginRun(fromMicroseconds(lNow)); });
            inTransaction([&] { listen(lNow, ZTKST_Listening, lAgent); });
            take(makeRecords(lNow), lNow);
            inTransaction([&] {
                listen(lNow + gcMinute, ZTKST_Failed, lAgent);
                noteSan(lNow, lDay);
                store().setMark("day " + std::to_string(lDay), fromMicroseconds(lNow));
                store().setValue("outlet.test.seq", "1");
                store().noteGap({.mFrom = fromMicroseconds(lNow),
                                 .mTo = fromMicroseconds(lNow),
                                 .mReason = "lost",
                                 .mGeneration = {},
                                 .mCounts = {}});
                store().endAgent(lAgent, fromMicroseconds(lNow), fromMicroseconds(lNow + gcMinute), true, "killed");
            });
            take(makeRecords(lNow + gcMinute), lNow + gcMinute);
            closeAt(lNow + gcDay / 2);
            inTransaction([&] { store().endRun(fromMicroseconds(lNow + gcDay / 2)); });
            closeStore();  // the next run's caches are empty
        }
    }
    static std::int64_t endOf(unsigned aDays) { return gcBase + aDays * gcDay; }

private:
    static constexpr unsigned scPorts = 3;

    static std::vector<ZTSTestRecord> makeRecords(std::int64_t aTime) {
        std::vector<ZTSTestRecord> lRecords;
        for (unsigned i = 0; i < 12; ++i) {
            lRecords.push_back(makeQueueFull(gcPortA + i % scPorts, aTime + i * gcSecond, aTime + i * gcSecond, 3, i));
        }
        lRecords.push_back({.mKind = gcLsRjt,
                            .mData = makeLsRjtData(gcPortB, 3, {{9, 1}}),
                            .mBegin = aTime,
                            .mEnd = aTime,
                            .mPortName = {}});
        lRecords.push_back(
            {.mKind = gcLink, .mData = makeGenericData(), .mBegin = aTime, .mEnd = aTime, .mPortName = {}});
        return lRecords;
    }
    void listen(std::int64_t aNow, ZTEKindState aState, const std::string& acrAgent) {
        std::vector<ZTSKindStateNow> lStates;
        for (const ZTCKindKey lKind : {gcQueueFull, gcLsRjt, gcLink}) {
            lStates.push_back({.mWwpn = makeName(gcLocalPort), .mWwnn = {}, .mKind = lKind, .mState = aState});
        }
        store().noteCoverage(fromMicroseconds(aNow), lStates);
        store().noteRunning(fromMicroseconds(aNow));
        ZTSPageCounts lCounts;
        lCounts.mWwpn = makeName(gcLocalPort);
        lCounts.mKind = gcQueueFull;
        lCounts.mReceived = lCounts.mConsolidated = lCounts.mHeld = 5;
        store().noteLedger(acrAgent, std::span(&lCounts, 1));
    }
    void noteSan(std::int64_t aNow, unsigned aDay) {
        store().noteInitiator({.mWwpn = makeName(gcLocalPort), .mWwnn = makeName(aDay), .mHost = "host7"});
        std::vector<ZTSCounterSample> lSamples;
        ZTSTopology lTopology;
        lTopology.mInitiators.push_back({.mHost = "host7", .mWwpn = makeName(gcLocalPort), .mState = "Online"});
        for (unsigned i = 0; i < scPorts; ++i) {
            const ZTSFcName lPort = makeName(gcPortA + i);
            store().noteRemotePort({.mWwpn = lPort, .mWwnn = {}, .mFcId = aDay});
            lTopology.mRemotePorts.push_back({.mName = "rport-7:0-" + std::to_string(i),
                                              .mHost = "host7",
                                              .mWwpn = lPort,
                                              .mState = aDay % 2 == 0 ? "Online" : "Blocked"});
            lSamples.push_back({aNow, makeName(gcLocalPort), lPort, "fpin_cn", 2});
        }
        store().noteTopology(aNow, lTopology);
        store().noteCounters(lSamples);
    }
};

#endif
