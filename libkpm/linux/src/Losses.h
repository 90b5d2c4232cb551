/// Counts what the library could not see, and says so at most once a second and kind, with the running total.
#ifndef LIBKPM_LINUX_SRC_LOSSES_H
#define LIBKPM_LINUX_SRC_LOSSES_H

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <utility>

enum ZTELinuxLoss : std::uint8_t {
    ZTLO_SocketOverrun,     ///< the socket's buffer was full: any number of messages is lost
    ZTLO_MissingMessage,    ///< a number was passed over in the count of FC events
    ZTLO_ForeignMessage,    ///< a message that the kernel did not send
    ZTLO_MalformedMessage,  ///< a message that does not parse
    ZTLO_TraceOverrun,      ///< records that a processor's trace buffer had no place for
    ZTLO_MalformedRecord,   ///< a trace page or record that does not parse
    ZTLO_Failure            ///< reading failed otherwise, or memory ran out over an event
};
inline constexpr std::size_t gcLinuxLossCount = ZTLO_Failure + 1;

/// Used by one thread at a time.
class ZTCLinuxLosses {
public:
    using Clock = std::chrono::steady_clock;
    using Sink = std::function<void(const std::string&)>;

    explicit ZTCLinuxLosses(Sink aSink) : mSink(std::move(aSink)) {}

    void count(ZTELinuxLoss aKind, std::uint64_t aNumber = 1) { mRows[aKind].mTotal += aNumber; }
    std::uint64_t getTotal(ZTELinuxLoss aKind) const { return mRows[aKind].mTotal; }

    /// Says what is new of each kind that has been silent for a second.
    void tell(Clock::time_point aNow);

    /// Says what is new of every kind.
    void tellAll();

private:
    struct Row {
        std::uint64_t mTotal = 0;
        std::uint64_t mTold = 0;
        std::optional<Clock::time_point> mToldAt;
    };

    void tellRow(std::size_t aKind);

    Sink mSink;
    std::array<Row, gcLinuxLossCount> mRows;
};

#endif
