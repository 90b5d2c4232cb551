/// An agent of a test: it holds events, hands them over when it is asked, and keeps a status page that is exact.
#ifndef TESTS_COLLECTOR_PAGEDAGENT_H
#define TESTS_COLLECTOR_PAGEDAGENT_H

#include <atomic>
#include <memory>
#include <mutex>
#include <vector>

#include "tests/collector/CollectorStage.h"
#include "tests/support/StatusPageFile.h"
#include "tests/unit/client/FakeAgent.h"

class ZTCPagedAgent {
public:
    /// Starts serving, with a start id of its own.
    ZTCPagedAgent(ZTCCollectorStage& arStage, const ZTSStagedStart& acrStart);
    /// Ends as a killed agent does: what it held stays on the page.
    ~ZTCPagedAgent();

    /// So many events happen: one record each, or one record for all. Rings the bell from then on where asked to.
    void happen(unsigned aRecords, unsigned aOccurrencesEach = 1, bool aRings = true);
    /// Bytes that each response has more, in a record's event data.
    void setPadding(std::size_t aBytes) { mPadding = aBytes; }
    /// From now on each answer ends so many bytes early, and the agent dies behind it.
    void cutNextResponse(std::size_t aBytes) { mCut = aBytes; }

    std::uint64_t getHappened() const { return mHappened; }
    std::uint64_t getHandedOver() const { return mHandedOver; }
    bool hasShutDown() const { return mHasShutDown; }
    bool hasDied() const { return mHasDied; }
    std::vector<ZTCWireBytes> getRequests() const { return mAgent->getRequests(); }

private:
    void serve(ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest);
    ZTCWireBytes takeAll();

    const int mBell;
    ZTCStatusPageFile mPage;
    std::mutex mMutex;
    std::vector<unsigned> mHeld;  // under mMutex: occurrences of each record
    std::atomic<std::uint64_t> mHappened{0};
    std::atomic<std::uint64_t> mHandedOver{0};
    std::atomic<std::size_t> mPadding{0};
    std::atomic<std::size_t> mCut{0};
    std::atomic<bool> mHasShutDown{false};
    std::atomic<bool> mHasDied{false};
    std::unique_ptr<ZTCFakeAgent> mAgent;
};

#endif
