/// Functions that a test takes the place of, for as long as an object lives. The linker leads every call to them here.
#ifndef TESTS_UNIT_LOGTEXTS_SUPPORT_INTERPOSED_H
#define TESTS_UNIT_LOGTEXTS_SUPPORT_INTERPOSED_H

#include <atomic>

/// While it lives, something is on; one at a time.
template <std::atomic<bool>& trIsOn>
class ZTCInterposed {
public:
    ZTCInterposed() { trIsOn = true; }
    ~ZTCInterposed() { trIsOn = false; }
    ZTCInterposed(const ZTCInterposed&) = delete;
    ZTCInterposed& operator=(const ZTCInterposed&) = delete;
};

extern std::atomic<bool> gIsLogCodeKept;
extern std::atomic<bool> gIsPollBroken;
extern std::atomic<bool> gIsConditionalDestructionBroken;

/// setLogCode changes nothing.
using ZTCKeptLogCode = ZTCInterposed<gIsLogCodeKept>;
/// ClibPoll throws ZTCClibPollFailedEx for two descriptors or more: events of the process are still waited for.
using ZTCBrokenPoll = ZTCInterposed<gIsPollBroken>;
/// pthread_cond_destroy fails.
using ZTCBrokenConditionalDestruction = ZTCInterposed<gIsConditionalDestructionBroken>;

#endif
