/// Finds lost messages in a running count. The kernel numbers its FC events with one count for all hosts, and two
/// processors may send theirs in the wrong order. So a missing number counts as lost only after all messages that have
/// arrived were read.
#ifndef LIBKPM_LINUX_SRC_EVENTSEQUENCE_H
#define LIBKPM_LINUX_SRC_EVENTSEQUENCE_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

class ZTCLinuxEventSequence {
public:
    /// Notes a message of this number. The first one begins the count; a number far behind begins it anew.
    void note(std::uint32_t aNumber);

    /// How many numbers were passed over and have not come after all. Counts each once.
    std::uint64_t takeLost();

private:
    struct Gap {
        std::uint32_t mFirst;
        std::uint32_t mCount;
    };

    std::optional<std::uint32_t> mNext;
    std::vector<Gap> mGaps;
    std::uint64_t mLost = 0;  // of gaps that are no longer kept
};

#endif
