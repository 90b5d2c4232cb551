/// Joins check conditions with their sense data where the two come as separate trace records.
///
/// The kernel writes a command's outcome first and its sense data soon after. That may happen on another processor, and
/// so in another buffer: the two records can be read in either order. An outcome waits a short time for its sense data,
/// and is then handed on without them.
///
/// Sense data belong to the last outcome of the same command that was written before them. Sense data that belong to no
/// outcome are dropped after the same time; the kernel also decodes sense data of commands that it sends itself.
///
/// Makes no system call. Belongs to one thread.
#ifndef LIBKPM_LINUX_SRC_SENSEMATCHER_H
#define LIBKPM_LINUX_SRC_SENSEMATCHER_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <vector>

#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/SenseData.h"

class ZTCSenseMatcher {
public:
    using Clock = std::chrono::steady_clock;

    /// How long an outcome waits. It is longer than the time in which a completion moves to another processor and its
    /// record is read.
    static constexpr std::chrono::milliseconds scWait{1000};

    /// With more outcomes and sense data than this, take() hands on all outcomes without waiting.
    static constexpr std::size_t scMostHeld = 16384;

    /// @param aTime  the record's own time, by the clock of the trace
    /// @param aNow   when it was read
    /// Throw std::bad_alloc; what was held before is unchanged then.
    void addOutcome(const ZTSScsiOutcome& acrOutcome, std::uint64_t aTime, Clock::time_point aNow);
    void addSense(const ZTSSenseRecord& acrRecord, std::uint64_t aTime, Clock::time_point aNow);

    /// Returns each outcome that has its sense data or has waited long enough, once. To be called when all records at
    /// hand were added. Allocates nothing. The result is valid until the next call of any function.
    const std::vector<ZTSScsiOutcome>& take(Clock::time_point aNow) noexcept;

    /// Returns all outcomes, with their sense data where these have come.
    const std::vector<ZTSScsiOutcome>& takeAll() noexcept { return take(Clock::time_point::max()); }

    /// When the first outcome will have waited long enough; empty where no outcome waits.
    std::optional<Clock::time_point> getNextTime() const;

private:
    struct Outcome {
        ZTSScsiOutcome mOutcome;
        std::uint64_t mTime;
        Clock::time_point mEnd;
    };
    struct Sense {
        ZTSSenseValues mValues;
        std::uint64_t mTime;
        Clock::time_point mEnd;
    };
    struct Command {
        std::vector<Outcome> mOutcomes;  // by time
        std::vector<Sense> mSenses;      // by time
    };

    void makeRoom();
    void settle(Command& arCommand, Clock::time_point aNow) noexcept;

    std::map<ZTSCommandName, Command> mCommands;
    std::size_t mHeld = 0;               // outcomes and sense data
    std::vector<ZTSScsiOutcome> mReady;  // as taken last; has room for all that are held
};

#endif
