/// Tables and lines of text for a terminal: columns that fit a width, numbers with separators, wrapped lines.
///
/// Widths are counted in characters of UTF-8 text; each counts as one column.
#ifndef SENSOR_VIEWS_INCLUDE_TEXTTABLE_H
#define SENSOR_VIEWS_INCLUDE_TEXTTABLE_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/client/include/NumberText.h"

struct ZTSTextColumn {
    const char* mpTitle;
    bool mIsRight = false;        ///< numbers stand at the right edge
    unsigned mDropOrder = 0;      ///< where the width does not suffice, the highest goes first; 0: never
    std::size_t mLeastWidth = 0;  ///< it is not cut below this; 0: it is not cut at all
    std::size_t mReserved = 0;    ///< it is this wide even before a cell needs it
};

/// Collects rows and hands out their text. Widths only grow, so that what is printed later stays aligned.
class ZTCTextTable {
public:
    /// @param aWidth  characters in a line; 0: no limit
    ZTCTextTable(std::vector<ZTSTextColumn> aColumns, std::size_t aWidth);

    /// One text a column. Control characters are escaped.
    void addRow(std::vector<std::string> aCells);
    std::size_t countRows() const { return mRows.size(); }

    /// The rows since the last call, a line each; before the first ones the heading. Columns that do not fit are
    /// dropped at the first call. Then the last ones that may be cut are cut, with "..".
    std::string takeText();

    /// Another width from the next text on, such as a terminal's that has changed.
    void setWidth(std::size_t aWidth);

private:
    void growWidths(const std::vector<std::string>& acrCells);
    void fit();
    std::string formatLine(const std::vector<std::string>& acrCells) const;

    std::vector<ZTSTextColumn> mColumns;
    std::size_t mWidth;
    std::vector<std::vector<std::string>> mRows;
    std::vector<std::size_t> mWanted;   ///< width of each column's widest cell so far
    std::vector<std::size_t> mGranted;  ///< width that it gets; 0: dropped
    bool mHasHeading = false;
};

/// Characters of UTF-8 text; bytes that are none count each.
std::size_t countCharacters(std::string_view aText);

/// At most so many characters; where it is cut it ends in "..".
std::string cutText(const std::string& acrText, std::size_t aCharacters);

/// Control characters as \xNN; UTF-8 stays, bytes that are none become \xNN.
std::string escapeControls(std::string_view aText);

/// "256 KiB", "1.5 GiB", "17 B".
std::string formatBytes(std::uint64_t aBytes);

/// Lines of at most so many characters, broken at blanks; a longer word gets a line of its own. 0: one line.
std::vector<std::string> wrapText(std::string_view aText, std::size_t aCharacters);

#endif
