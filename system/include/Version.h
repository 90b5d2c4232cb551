/// The version of the agent.

#ifndef SYSTEM_INCLUDE_VERSION_H
#define SYSTEM_INCLUDE_VERSION_H

#include "common/include/String.h"

#define ZT_MAJOR_VERSION 3
#define ZT_MINOR_VERSION 0
#define ZT_REVISION_NO 1
#define ZT_BUILD_NO 2

/// Never changes after construction.
class ZTCVersion {
public:
    ZTCVersion(unsigned aMajor, unsigned aMinor, unsigned aRevision, unsigned aBuild)
        : mMajor(aMajor), mMinor(aMinor), mRevision(aRevision), mBuild(aBuild) {}

    /// The four numbers with dots between them: "3.0.1.2".
    ZTCString getVersion() const;

private:
    const unsigned mMajor;
    const unsigned mMinor;
    const unsigned mRevision;
    const unsigned mBuild;
};

#endif
