#include "tests/faults/FaultTable.h"

#include <cerrno>

#include "tests/faults/FaultInjection.h"

const std::vector<ZTSFaultWay>& faultWays() {
    static const std::vector<ZTSFaultWay> slWays = [] {
        // call, name, errno, bytes, lasting, absorbed, quick
        std::vector<ZTSFaultWay> lWays = {
            {"close", "EIO", EIO, 0, false, true, false},
            {"dlopen", "fails", ENOENT, 0, false, false, true},
            {"dup2", "EINTR", EINTR, 0, false, true, false},
            {"dup2", "EBUSY", EBUSY, 0, false, false, true},
            {"eventfd", "EMFILE", EMFILE, 0, false, false, true},
            {"fcntl", "EMFILE", EMFILE, 0, false, false, true},
            {"flock", "EINTR", EINTR, 0, false, true, false},
            {"flock", "EWOULDBLOCK", EWOULDBLOCK, 0, false, true, true},
            {"flock", "ENOLCK", ENOLCK, 0, false, false, true},
            {"fork", "EAGAIN", EAGAIN, 0, false, false, true},
            {"fstat", "EIO", EIO, 0, false, false, true},
            {"ftruncate", "EINTR", EINTR, 0, false, true, false},
            {"ftruncate", "EIO", EIO, 0, false, false, true},
            {"getcwd", "ENOENT", ENOENT, 0, false, false, true},
            {"ioctl", "EIO", EIO, 0, false, false, true},
            {"kill", "EPERM", EPERM, 0, false, false, true},
            {"lstat", "EACCES", EACCES, 0, false, false, true},
            {"mkdir", "EACCES", EACCES, 0, false, false, true},
            {"mkfifo", "ENOSPC", ENOSPC, 0, false, false, true},
            {"open", "EINTR", EINTR, 0, false, true, false},
            {"open", "EACCES", EACCES, 0, false, false, false},
            {"open", "EMFILE", EMFILE, 0, false, false, true},
            {"poll", "EINTR", EINTR, 0, false, true, true},
            {"poll", "ENOMEM", ENOMEM, 0, false, false, true},
            {"pread", "EINTR", EINTR, 0, false, true, false},
            {"pread", "EIO", EIO, 0, false, true, true},
            {"pthread_cond_init", "ENOMEM", ENOMEM, 0, false, false, true},
            {"pthread_cond_timedwait", "wakes early", 0, 0, false, true, true},
            {"pthread_condattr_init", "ENOMEM", ENOMEM, 0, false, false, true},
            {"pthread_condattr_setclock", "EINVAL", EINVAL, 0, false, false, false},
            {"pthread_create", "EAGAIN", EAGAIN, 0, false, false, true},
            {"pthread_mutex_init", "ENOMEM", ENOMEM, 0, false, false, true},
            {"pthread_mutexattr_init", "ENOMEM", ENOMEM, 0, false, false, true},
            {"pthread_mutexattr_settype", "EINVAL", EINVAL, 0, false, false, false},
            {"pwrite", "EINTR", EINTR, 0, false, true, false},
            {"pwrite", "one byte", 0, 1, false, true, true},
            {"pwrite", "ENOSPC", ENOSPC, 0, false, false, true},
            {"read", "EINTR", EINTR, 0, false, true, false},
            {"read", "EAGAIN", EAGAIN, 0, false, true, false},
            {"read", "one byte", 0, 1, false, true, true},
            {"read", "EIO", EIO, 0, false, false, true},
            {"rename", "EACCES", EACCES, 0, false, true, true},
            {"setsid", "EPERM", EPERM, 0, false, false, true},
            {"signalfd", "EMFILE", EMFILE, 0, false, false, true},
            {"stat", "EACCES", EACCES, 0, false, false, true},
            {"unlink", "EACCES", EACCES, 0, false, false, true},
            {"utimensat", "EACCES", EACCES, 0, false, false, true},
            {"write", "EINTR", EINTR, 0, false, true, false},
            {"write", "one byte", 0, 1, false, true, true},
            {"write", "ENOSPC", ENOSPC, 0, false, true, true},
            {"write", "EIO", EIO, 0, false, true, false},
            {"writev", "EINTR", EINTR, 0, false, true, false},
            {"writev", "EAGAIN", EAGAIN, 0, false, true, false},
            {"writev", "one byte", 0, 1, false, true, true},
            {"writev", "EPIPE", EPIPE, 0, false, false, true},
        };
        if (ZTCFaultInjection::isForAllocations()) {
            lWays.push_back({gcAllocationCall, "none", ENOMEM, 0, false, false, true});
            lWays.push_back({gcAllocationCall, "none any more", ENOMEM, 0, true, false, false});
            lWays.push_back({"dlsym", "fails", 0, 0, false, false, true});
        }
        return lWays;
    }();
    return slWays;
}
