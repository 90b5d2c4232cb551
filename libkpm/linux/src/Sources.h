/// The two sources in the kernel that need rights: the socket of FC events, and the directories of trace instances.
/// Tests replace them with doubles.
#ifndef LIBKPM_LINUX_SRC_SOURCES_H
#define LIBKPM_LINUX_SRC_SOURCES_H

#include <memory>

#include "libkpm/linux/src/FcEventSocket.h"
#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/TraceInstance.h"

class ZTCLinuxSources : public ZTCTraceFiles {
public:
    /// As ZTCFcEventSocket::open.
    virtual std::unique_ptr<ZTCFcEventSource> openFcEvents(ZTSFeedProblem& arProblem) {
        return ZTCFcEventSocket::open(arProblem);
    }
};

#endif
