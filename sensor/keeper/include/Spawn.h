/// Starts a process in a process group of its own. It inherits only what is listed for it.
#ifndef SENSOR_KEEPER_INCLUDE_SPAWN_H
#define SENSOR_KEEPER_INCLUDE_SPAWN_H

#include <sys/types.h>

#include <string>
#include <vector>

#include "sensor/client/include/FileDescriptor.h"

enum ZTEPrivilege {
    ZTPV_PassOn,  ///< every capability that this process has, although it may not be root
    ZTPV_None     ///< none, although it may be root, and no way to get one
};

struct ZTSSpawn {
    std::string mProgram;                   ///< a path
    std::vector<std::string> mArguments;    ///< without the program's name
    std::vector<std::string> mEnvironment;  ///< "NAME=VALUE"
    std::vector<int> mDescriptors;          ///< handed on under their numbers; above 2
    bool mHasOutput = false;                ///< keeps standard output; otherwise that goes to standard error
    ZTEPrivilege mPrivilege = ZTPV_None;
};

struct ZTSProcess {
    pid_t mPid = 0;
    ZTCFileDescriptor mPidFd;  ///< readable once it has ended

    bool isThere() const { return mPidFd.isOpen(); }
};

/// Returns once the program runs. Throws ZTCSystemCallEx, also where the program cannot be executed. The calling
/// process has one thread.
ZTSProcess spawn(const ZTSSpawn& acrSpawn);

/// Gives up the effective and the ambient capabilities of this process. The permitted ones stay, for programs that are
/// started with ZTPV_PassOn. Does nothing as root. Throws ZTCSystemCallEx.
void keepCapabilitiesForOthers();

/// A descriptor that is readable once the process has ended; not open where there is no such process.
ZTCFileDescriptor openPidFd(pid_t aPid);

/// Sends a signal to the very process that the descriptor was opened for. Does nothing where that has ended.
void sendSignal(const ZTCFileDescriptor& acrPidFd, int aSignal);

/// Waits for the end of a child that has ended, and returns its status as waitpid() does.
int reap(const ZTSProcess& acrProcess);

#endif
