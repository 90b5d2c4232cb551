/// A power cut for SQLite: while it lives, databases are opened through a file layer that remembers what was synced.
///
/// From a chosen operation on, every write, truncation and sync fails, as on a machine that has lost its power. cut()
/// then takes the files back to what was synced, together with any part of what was written since: whole writes, and
/// the first sectors of a write. One thread opens, writes and closes databases; the functions below but cut() are for
/// any.
#ifndef TESTS_UNIT_STORE_POWERCUT_H
#define TESTS_UNIT_STORE_POWERCUT_H

#include <cstdint>
#include <functional>

class ZTCPowerCut {
public:
    ZTCPowerCut();
    ~ZTCPowerCut();
    ZTCPowerCut(const ZTCPowerCut&) = delete;
    ZTCPowerCut& operator=(const ZTCPowerCut&) = delete;

    /// The n-th operation from now on (from 1 on) and all later ones fail. 0: none.
    void failFrom(std::uint64_t aNth);
    bool hasFailed() const;

    /// With all databases closed. `acrDraw(n)` chooses a number from 0 to n - 1. `aKeepsAll`: nothing that was written
    /// is lost, as where only the process was killed.
    void cut(bool aKeepsAll, const std::function<unsigned(unsigned)>& acrDraw);
};

#endif
