#include "tests/support/ScriptedStorm.h"

#include <stdexcept>

void ZTCScriptedStorm::start(unsigned aThreads, std::uint64_t aRounds, const std::vector<ZTSLibraryEvent>& acrEvents,
                             const Deliver& acrDeliver) {
    if (!mThreads.empty()) {
        throw std::runtime_error("a storm is under way");
    }
    mIsToStop = false;
    mDelivered = 0;
    for (unsigned i = 0; i < aThreads; ++i) {
        mThreads.emplace_back([this, i, aRounds, acrEvents, acrDeliver] { run(i, aRounds, acrEvents, acrDeliver); });
    }
}

void ZTCScriptedStorm::run(unsigned aThread, std::uint64_t aRounds, const std::vector<ZTSLibraryEvent>& acrEvents,
                           const Deliver& acrDeliver) {
    for (std::uint64_t lRound = 0; aRounds == 0 || lRound < aRounds; ++lRound) {
        for (std::size_t i = 0; i < acrEvents.size(); ++i) {
            if (mIsToStop || !acrDeliver(acrEvents[(i + aThread) % acrEvents.size()])) {
                return;
            }
            ++mDelivered;
        }
    }
}

std::uint64_t ZTCScriptedStorm::join() {
    for (std::thread& lrThread : mThreads) {
        lrThread.join();
    }
    mThreads.clear();
    return mDelivered;
}
