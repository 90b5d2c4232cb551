/// One line of the log while it is being made.

#ifndef COMMON_INCLUDE_LOGLINE_H
#define COMMON_INCLUDE_LOGLINE_H

#include <cstdarg>
#include <cstddef>

/// Collects a line's pieces. Short lines stay on the stack; for a long one memory is allocated, and where that fails
/// the line is cut and ends in "...". Nothing here throws. The line break at the end is always there.
class ZTCLogLine {
public:
    /// Bytes of a time stamp, `YYYY-MM-DD HH:MM:SS.uuuuuu`, which the log file fills in when it takes the line.
    static constexpr std::size_t gcStampLength = 26;

    /// Begins a line of mark and text alone.
    explicit ZTCLogLine(const char* apMark) noexcept;

    /// Begins a line with room for a time stamp, mark and source position.
    ZTCLogLine(const char* apMark, unsigned aLine, const char* apFunction, const char* apFile) noexcept;

    ZTCLogLine(const ZTCLogLine&) = delete;
    ZTCLogLine& operator=(const ZTCLogLine&) = delete;
    ~ZTCLogLine();

    /// Adds the formatted text, escapes its control characters, drops one line break at its end, and ends the line.
    /// A format that cannot be carried out is added itself, as text. Called once.
    void finish(const char* apFormat, std::va_list aArguments) noexcept;

    /// Whether the line begins with room for a time stamp.
    bool isStamped() const noexcept { return mIsStamped; }

    char* getData() noexcept { return mpData; }
    std::size_t getLength() const noexcept { return mLength; }

private:
    static constexpr std::size_t gcInlineSize = 2048;

    void add(const char* apBytes, std::size_t aCount) noexcept;
    void formatAtLength(char* apShort, std::size_t aSize, const char* apFormat, std::va_list aArguments) noexcept;
    void addEscaped(const char* apText, std::size_t aLength) noexcept;
    bool makeRoomFor(std::size_t aCount) noexcept;

    char mInline[gcInlineSize];
    char* mpData = mInline;
    std::size_t mLength = 0;
    std::size_t mCapacity = gcInlineSize;
    bool mIsStamped = false;
    bool mIsCut = false;
};

#endif
