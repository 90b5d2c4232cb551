/// The netlink socket on which the kernel sends FC events.
#ifndef LIBKPM_LINUX_SRC_FCEVENTSOCKET_H
#define LIBKPM_LINUX_SRC_FCEVENTSOCKET_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>

#include "libkpm/common/include/Descriptor.h"
#include "libkpm/linux/src/FeedState.h"

enum ZTELinuxReceived : std::uint8_t {
    ZTLR_Datagram,   ///< mSize bytes, from the kernel
    ZTLR_Foreign,    ///< a datagram of another sender: to be dropped
    ZTLR_Truncated,  ///< a datagram longer than the buffer: to be dropped
    ZTLR_Overrun,    ///< the socket had no place for datagrams before this
    ZTLR_Empty,      ///< nothing more for now
    ZTLR_Failed      ///< the socket is of no more use
};

struct ZTSLinuxReceived {
    ZTELinuxReceived mOutcome = ZTLR_Empty;
    std::size_t mSize = 0;
};

/// Where datagrams with FC events come from; tests have one of their own. One thread at a time.
class ZTCFcEventSource {
public:
    virtual ~ZTCFcEventSource() = default;

    /// Readable when `receive()` has something to return.
    virtual int getDescriptor() const = 0;

    /// Never waits.
    virtual ZTSLinuxReceived receive(std::span<std::uint8_t> aBuffer) = 0;
};

class ZTCFcEventSocket : public ZTCFcEventSource {
public:
    /// Subscribes. Null, with the reason and what would help in `arProblem`, where that cannot be done, or where
    /// nothing would ever come.
    static std::unique_ptr<ZTCFcEventSource> open(ZTSFeedProblem& arProblem);

    /// Receives from a netlink socket that is bound.
    explicit ZTCFcEventSocket(ZTCLibraryDescriptor aSocket) : mSocket(std::move(aSocket)) {}

    int getDescriptor() const override { return mSocket.get(); }
    ZTSLinuxReceived receive(std::span<std::uint8_t> aBuffer) override;

private:
    ZTCLibraryDescriptor mSocket;
};

#endif
