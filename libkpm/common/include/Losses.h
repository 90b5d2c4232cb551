/// Counts what a library has lost, under names from a table. Reports each name in the agent's log at most once a
/// second, and the running totals through the report function.
#ifndef LIBKPM_COMMON_INCLUDE_LOSSES_H
#define LIBKPM_COMMON_INCLUDE_LOSSES_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

/// One kind of loss.
struct ZTSLossKind {
    const char* mpName;  ///< as it is reported: short, lower case
    const char* mpText;  ///< as it is logged, behind the number
};

/// Used by one thread at a time.
class ZTCLosses {
public:
    using Clock = std::chrono::steady_clock;

    /// The kinds outlive the object and are numbered in their order.
    explicit ZTCLosses(std::span<const ZTSLossKind> aKinds) : mKinds(aKinds), mRows(aKinds.size()) {}

    void count(std::size_t aKind, std::uint64_t aNumber = 1) { mRows[aKind].mTotal += aNumber; }
    std::uint64_t getTotal(std::size_t aKind) const { return mRows[aKind].mTotal; }

    /// Reports what is new of each kind that was not reported for a second. A kind that lacks the memory to be reported
    /// stays new.
    void tell(Clock::time_point aNow);

    /// Reports what is new of every kind at once.
    void tellAll();

private:
    struct Row {
        std::uint64_t mTotal = 0;
        std::uint64_t mTold = 0;
        std::optional<Clock::time_point> mToldAt;
    };

    void tellRow(std::size_t aKind);

    const std::span<const ZTSLossKind> mKinds;
    std::vector<Row> mRows;
};

#endif
