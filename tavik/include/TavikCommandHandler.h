/// The thread that serves the command channel: one command is read, processed and answered before the next wait.
#ifndef TAVIK_INCLUDE_TAVIKCOMMANDHANDLER_H
#define TAVIK_INCLUDE_TAVIKCOMMANDHANDLER_H

#include "os/common/include/SystemInterface.h"
#include "os/common/include/TimedWaitThreadComponent.h"

/// The thread procedure; takes a ZTSThreadArguments and returns null.
void* CommandHandlerThreadProcedure(void* lpArgs);

class ZTCTavikCommandHandler : public ZTCTimedWaitThreadComponent {
public:
    /// aWaitTime: the longest wait for a command, in seconds.
    ZTCTavikCommandHandler(ZTCSystemInterface* apSystemInterface, unsigned int aWaitTime);
};

#endif
