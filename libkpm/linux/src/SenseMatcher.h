/// Joins check conditions with their sense data where the two come as separate trace records. A command's outcome is
/// written first, its sense data soon after, perhaps on another processor and so to another buffer: the records may be
/// read in any order. An outcome waits a short time for its sense data and is then handed on without. Pure.
///
/// Sense data belong to the last outcome of a command of that name that was written before them. Such as belong to
/// none (the kernel looks at sense data of its own commands too) are dropped after the same time.
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

    /// How long an outcome waits. Longer than a completion takes to move to another processor and its record to be
    /// read.
    static constexpr std::chrono::milliseconds scWait{1000};

    /// With more outcomes than this, the oldest of each command do not wait any longer.
    static constexpr std::size_t scMostHeld = 16384;

    /// Times of records are in one clock, that of the trace; `aNow` is when they are read. Throw std::bad_alloc, with
    /// what was held before as it was.
    void addOutcome(const ZTSScsiOutcome& acrOutcome, std::uint64_t aTime, Clock::time_point aNow);
    void addSense(const ZTSSenseRecord& acrRecord, std::uint64_t aTime, Clock::time_point aNow);

    /// The outcomes that have their sense data, or have waited long enough; each once. To be called when all records
    /// at hand were added. Allocates nothing. What it returns is good until the next call of any operation.
    const std::vector<ZTSScsiOutcome>& take(Clock::time_point aNow) noexcept;

    /// All outcomes that are held, with their sense data where these have come.
    const std::vector<ZTSScsiOutcome>& takeAll() noexcept { return take(Clock::time_point::max()); }

    /// When the first outcome will have waited long enough; nothing where none waits.
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
