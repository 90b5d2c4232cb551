/// The name of a source file as the log shows it, made at compile time.
///
/// The build gives __FILE__ as a path from the root of the sources, or, where a compiler cache has made the paths
/// relative, from the build directory within it. The label is that path without the `../` at its beginning and without
/// its extension; the agent's own sources, tavik/src/NAME.cpp, are labelled .//NAME.

#ifndef COMMON_INCLUDE_FILELABEL_H
#define COMMON_INCLUDE_FILELABEL_H

#include <cstddef>

/// A label; a structural type, so that it can be a template's argument and needs no storage at the place of use.
template <std::size_t tLength>
struct ZTSFileLabel {
    /// Makes the label of a path.
    consteval ZTSFileLabel(const char (&acrPath)[tLength]) {
        constexpr char lcAgent[] = "tavik/src/";
        constexpr std::size_t lcAgentLength = sizeof(lcAgent) - 1;

        std::size_t lIn = 0;
        while (lIn + 3 < tLength && acrPath[lIn] == '.' && acrPath[lIn + 1] == '.' && acrPath[lIn + 2] == '/') {
            lIn += 3;
        }

        bool lIsAgent = tLength - lIn > lcAgentLength;
        for (std::size_t i = 0; lIsAgent && i < lcAgentLength; ++i) {
            lIsAgent = acrPath[lIn + i] == lcAgent[i];
        }

        std::size_t lEnd = tLength - 1;
        for (std::size_t i = tLength - 1; i > lIn && acrPath[i] != '/'; --i) {
            if (acrPath[i] == '.' && acrPath[i - 1] != '/') {
                lEnd = i;
                break;
            }
        }

        std::size_t lOut = 0;
        if (lIsAgent) {
            mText[lOut++] = '.';
            mText[lOut++] = '/';
            mText[lOut++] = '/';
            lIn += lcAgentLength;
        }
        while (lIn < lEnd) {
            mText[lOut++] = acrPath[lIn++];
        }
    }

    /// The label, terminated by a zero; what follows it is zero too.
    char mText[tLength]{};
};

/// The one copy of a label in the program.
template <ZTSFileLabel tLabel>
constexpr const char* fileLabelText() noexcept {
    return tLabel.mText;
}

/// The label of a path given as a string literal.
#define ZT_FILE_LABEL_OF(aPath) (fileLabelText<ZTSFileLabel(aPath)>())

/// The label of the file that uses this macro.
#define ZT_FILE_LABEL ZT_FILE_LABEL_OF(__FILE__)

#endif
