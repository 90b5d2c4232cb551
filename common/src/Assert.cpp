#include "common/include/Assert.h"

#include <unistd.h>

#include <atomic>
#include <cstdlib>

void failAssertion(unsigned aLine, const char* apFunction, const char* apFile, const char* apText) noexcept {
    PrintLogMessageWithTimeStamp(ZTLL_Halt, "-H-", aLine, apFunction, apFile, "Assertion [ %s ] failed\n", apText);

    static constinit std::atomic<bool> sIsExiting{false};
    static constinit thread_local bool sIsExitingHere = false;

    if (sIsExitingHere) {
        // A handler of this very exit has failed: running exit once more is undefined.
        _exit(1);
    }
    if (sIsExiting.exchange(true)) {
        while (true) {
            pause();
        }
    }
    sIsExitingHere = true;
    std::exit(1);
}
