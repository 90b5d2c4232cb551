/// C-library calls behind one thin layer.
///
/// A wrapper reports failure by throwing; the texts name the object and the system's reason. The calls on
/// descriptors return ordinary outcomes instead: a positive count, 0 (end of file, nothing written, time-out), or
/// a negated error number that the wrapper lists. Every descriptor made here is close-on-exec and above the three
/// standard ones. So no file gets the number of a standard stream, even in a process that was started without
/// one.
///
/// All functions may be called from any thread.

#ifndef OS_COMMON_INCLUDE_CLIB_H
#define OS_COMMON_INCLUDE_CLIB_H

#include <poll.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <sys/uio.h>

#include <cstddef>
#include <cstdint>

#include "common/include/Exception.h"

// ---- Environment, memory and text ----

/// The value of the environment variable, or null where it is unset. Where apBuffer is not null the value is copied
/// there as well; the caller made it large enough. The result belongs to the environment.
const char* ClibGetenv(const char* apName, char* apBuffer);

/// Copies the text and its terminator into the aSize bytes at apTo and returns apTo. Throws ZTCInvalidEx, and writes
/// nothing, where it does not fit.
char* ClibStrcpy(char* apTo, std::size_t aSize, const char* apFrom);

/// The same for an array, whose size is its own limit.
template <std::size_t N>
char* ClibStrcpy(char (&arTo)[N], const char* apFrom) {
    return ClibStrcpy(arTo, N, apFrom);
}

/// Negative, 0 or positive, as strcmp.
int ClibStrcmp(const char* apLeft, const char* apRight);

/// Formats into the aSize bytes at apBuffer, cut to fit and always terminated. Returns the length of the text.
int ClibSprintf(char* apBuffer, std::size_t aSize, const char* apFormat, ...) __attribute__((format(printf, 3, 4)));

std::uint32_t ClibNtohl(std::uint32_t aNetworkOrder);
std::uint32_t ClibHtonl(std::uint32_t aHostOrder);
void* ClibMemcpy(void* apTo, const void* apFrom, std::size_t aSize);
void* ClibMemset(void* apTo, int aByte, std::size_t aSize);

// ---- Paths ----

/// Makes the directory with the mode less the umask. Throws ZTCExistsEx where the path exists already,
/// ZTCClibMkdirFailedEx otherwise.
void ClibMkdir(const char* apPath, int aMode);

/// Makes the FIFO with the mode less the umask. Throws ZTCExistsEx where the path exists already,
/// ZTCClibMkfifoFailedEx otherwise.
void ClibMkfifo(const char* apPath, ::mode_t aMode);

/// Fills the status of what the path leads to. Throws ZTCClibStatFailedEx.
void ClibStat(const char* apPath, struct stat* apStatus);

/// Fills the status of the file at the path itself, also of a symbolic link; false where there is none. Throws
/// ZTCClibStatFailedEx for every other failure.
bool ClibLstat(const char* apPath, struct stat* apStatus);

/// Sets the access and modification times of the file at the path itself to now: of a symbolic link those of the
/// link, never of what it leads to. Throws ZTCClibUtimeFailedEx.
void ClibUtime(const char* apPath);

/// Removes the name; false where there was none. Throws ZTCClibUnlinkFailedEx.
bool ClibUnlink(const char* apPath);

/// The kind of a file of this mode, for messages: "a FIFO", "a regular file", "a symbolic link" and so on.
const char* ClibFileKind(::mode_t aMode);

/// The system's text for an error number.
class ZTCErrnoText {
public:
    explicit ZTCErrnoText(int aErrno);
    const char* get() const { return mText; }

private:
    char mText[128];
};

// ---- Descriptors ----

/// Opens with close-on-exec added to the flags, and so that a terminal does not become the controlling one. Returns the
/// descriptor, 3 or higher. Throws ZTCClibOpenFailedEx.
int ClibOpen(const char* apPath, int aFlags, ::mode_t aMode = 0);

/// The same, but returns the negated error number instead of throwing.
int ClibTryOpen(const char* apPath, int aFlags, ::mode_t aMode = 0) noexcept;

/// An event counter (eventfd), non-blocking. Throws ZTCClibEventFailedEx.
int ClibEventFd();

/// Raises the counter, or takes it back to 0.
void ClibRaiseEvent(int aDescriptor) noexcept;
void ClibResetEvent(int aDescriptor) noexcept;

/// Takes over an inherited event counter: sets close-on-exec. Returns null, or a text that says why the descriptor
/// cannot be used: it is not open, it is not an event counter, or it is blocking.
const char* ClibAdoptEventFd(int aDescriptor) noexcept;

/// Moves a descriptor above the three standard ones, close-on-exec; the negated error number on failure. A descriptor
/// that is high enough, and a negative one, are handed back as they are.
int ClibLiftDescriptor(int aDescriptor) noexcept;

/// Closes; a negative descriptor is ignored.
void ClibClose(int aDescriptor) noexcept;

/// Fills the status of an open file. Throws ZTCClibStatFailedEx.
void ClibFstat(int aDescriptor, struct stat* apStatus);

/// Reads once. Returns the count, 0 at the end of the file, -EAGAIN or -EINTR. Throws ZTCClibReadFailedEx.
::ssize_t ClibRead(int aDescriptor, void* apTo, std::size_t aSize);

/// Writes once. Returns the count, 0, -EAGAIN, -EINTR or -EPIPE. Throws ZTCClibWriteFailedEx.
::ssize_t ClibWritev(int aDescriptor, const struct iovec* apParts, int aNumberOfParts);

/// Writes all bytes at the offset of a regular file. Throws ZTCClibWriteFailedEx.
void ClibPwriteAll(int aDescriptor, const void* apFrom, std::size_t aSize, ::off_t aOffset);

/// Cuts the file. Throws ZTCClibTruncateFailedEx.
void ClibFtruncate(int aDescriptor, ::off_t aSize);

/// Gives the file to the user; false where that is not allowed.
bool ClibTryGive(int aDescriptor, ::uid_t aUser) noexcept;

/// Sets the file's permissions; false where that is not allowed.
bool ClibTrySetMode(int aDescriptor, ::mode_t aMode) noexcept;

/// Waits. Returns the number of ready descriptors, 0 after the time-out, or -EINTR; a negative time-out never ends.
/// Throws ZTCClibPollFailedEx.
int ClibPoll(struct pollfd* apDescriptors, unsigned aNumberOfDescriptors, int aMilliseconds);

/// The number of bytes that wait in a pipe. Throws ZTCClibReadFailedEx.
std::size_t ClibBytesWaiting(int aDescriptor);

/// The most bytes that a pipe holds. Throws ZTCClibReadFailedEx.
std::size_t ClibPipeCapacity(int aDescriptor);

/// Takes the exclusive advisory lock of the open file without waiting; false while another holds it.
/// Throws ZTCClibLockFailedEx.
bool ClibTryLock(int aDescriptor);

// ---- Processes and time ----

/// Whether the process exists and is not a zombie. One that may not be signaled exists.
bool ClibIsProcessAlive(::pid_t aProcessId);

/// Sends the signal; false where there is no such process. Throws ZTCClibKillFailedEx.
bool ClibKill(::pid_t aProcessId, int aSignal);

/// Makes a process. Returns 0 in the child, the child's id in the parent. Throws ZTCClibForkFailedEx.
::pid_t ClibFork();

/// Becomes the leader of a new session. Throws ZTCClibSessionFailedEx.
void ClibSetsid();

/// Changes the working directory. Throws ZTCClibOpenFailedEx.
void ClibChdir(const char* apPath);

/// Opens the path with the flags and puts it in the place of the descriptor (of a standard stream). Throws
/// ZTCClibOpenFailedEx or ZTCClibDupFailedEx.
void ClibRedirect(int aDescriptor, const char* apPath, int aFlags);

/// Milliseconds on a clock that never steps.
std::int64_t ClibMonotonicMilliseconds() noexcept;

/// Pauses the calling thread.
void ClibSleep(int aMilliseconds) noexcept;

#endif
