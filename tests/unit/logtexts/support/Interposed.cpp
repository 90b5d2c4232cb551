#include "tests/unit/logtexts/support/Interposed.h"

#include <poll.h>
#include <pthread.h>

#include <cerrno>

#include "common/include/Exception.h"

std::atomic<bool> gIsLogCodeKept{false};
std::atomic<bool> gIsPollBroken{false};
std::atomic<bool> gIsConditionalDestructionBroken{false};

extern "C" {
void __real__Z10setLogCodej(unsigned) noexcept;
void __wrap__Z10setLogCodej(unsigned) noexcept;
int __real__Z8ClibPollP6pollfdji(struct pollfd*, unsigned, int);
int __wrap__Z8ClibPollP6pollfdji(struct pollfd*, unsigned, int);
int __real_pthread_cond_destroy(pthread_cond_t*);
int __wrap_pthread_cond_destroy(pthread_cond_t*);

void __wrap__Z10setLogCodej(unsigned aMask) noexcept {
    if (!gIsLogCodeKept) {
        __real__Z10setLogCodej(aMask);
    }
}

int __wrap__Z8ClibPollP6pollfdji(struct pollfd* apDescriptors, unsigned aCount, int aMilliseconds) {
    if (gIsPollBroken && aCount > 1) {
        throw ZTCClibPollFailedEx("poll failed: broken by the test");
    }
    return __real__Z8ClibPollP6pollfdji(apDescriptors, aCount, aMilliseconds);
}

int __wrap_pthread_cond_destroy(pthread_cond_t* apConditional) {
    return gIsConditionalDestructionBroken ? EBUSY : __real_pthread_cond_destroy(apConditional);
}
}
