/// Fails the n-th allocation of the calling thread: operator new, and malloc and realloc as the linked code calls them.

#ifndef TESTS_SUPPORT_FAILINGALLOCATION_H
#define TESTS_SUPPORT_FAILINGALLOCATION_H

/// While it lives, the n-th allocation of this thread from its construction on fails, once. One at a time.
class ZTCFailingAllocation {
public:
    explicit ZTCFailingAllocation(unsigned aNth) noexcept;
    ZTCFailingAllocation(const ZTCFailingAllocation&) = delete;
    ZTCFailingAllocation& operator=(const ZTCFailingAllocation&) = delete;
    ~ZTCFailingAllocation();

    /// Whether the n-th allocation was reached.
    bool hasFailed() const noexcept;
};

/// Runs a call whose n-th allocation (from 1 on) fails. Returns whether there was one.
template <typename Call>
bool failAllocation(unsigned aNth, Call aCall) {
    const ZTCFailingAllocation lFailure(aNth);
    aCall();
    return lFailure.hasFailed();
}

/// Runs a call with the first, the second, the third ... allocation failing, until it runs through without a failure.
/// Calls the check after each failed run. Returns the number of failed runs.
template <typename Call, typename Check>
unsigned failEachAllocation(Call aCall, Check aCheck) {
    unsigned lFailures = 0;
    while (failAllocation(lFailures + 1, aCall)) {
        ++lFailures;
        aCheck();
    }
    return lFailures;
}

#endif
