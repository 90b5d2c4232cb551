/// A limit on what the process may have of a resource.
#ifndef TESTS_SUPPORT_RESOURCELIMIT_H
#define TESTS_SUPPORT_RESOURCELIMIT_H

#include <gtest/gtest.h>
#include <sys/resource.h>

/// While it lives, the process, and what it starts, may have no more of a resource than this.
class ZTCResourceLimit {
public:
    ZTCResourceLimit(__rlimit_resource_t aResource, rlim_t aMost) : mResource(aResource) {
        EXPECT_EQ(0, getrlimit(mResource, &mFormer));
        const struct rlimit lLimit = {aMost, mFormer.rlim_max};
        EXPECT_EQ(0, setrlimit(mResource, &lLimit));
    }
    ~ZTCResourceLimit() { setrlimit(mResource, &mFormer); }
    ZTCResourceLimit(const ZTCResourceLimit&) = delete;
    ZTCResourceLimit& operator=(const ZTCResourceLimit&) = delete;

private:
    const __rlimit_resource_t mResource;
    struct rlimit mFormer {};
};

#endif
