/// Log lines that wait for a path to be set.

#ifndef COMMON_INCLUDE_HELDLINES_H
#define COMMON_INCLUDE_HELDLINES_H

#include <cstddef>

/// Whole lines one behind the other, up to a bound. Not locked: its owner guards it. Nothing throws, and there is no
/// destructor to run at exit: the owner calls drop() where the memory is to be given back.
class ZTCHeldLines {
public:
    /// The most bytes that are held.
    static constexpr std::size_t gcCapacity = std::size_t{64} * 1024;

    /// What add() answers where the bound is reached.
    static constexpr int gcFull = -1;

    constexpr ZTCHeldLines() noexcept = default;
    ZTCHeldLines(const ZTCHeldLines&) = delete;
    ZTCHeldLines& operator=(const ZTCHeldLines&) = delete;

    /// Holds a line, its line break included. Returns 0, gcFull, or ENOMEM.
    int add(const char* apLine, std::size_t aLength) noexcept;

    const char* getData() const noexcept { return mpData; }
    std::size_t getLength() const noexcept { return mLength; }

    /// The length of the line that begins at this offset, its line break included.
    std::size_t getLineLength(std::size_t aBegin) const noexcept;

    /// Forgets the lines and gives the memory back.
    void drop() noexcept;

private:
    char* mpData = nullptr;
    std::size_t mLength = 0;
    std::size_t mRoom = 0;
};

#endif
