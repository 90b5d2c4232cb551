/// Where standard output goes: how wide it is, whether colour is wanted, and the screen of `--watch`.
#ifndef SENSOR_TAVIK_SRC_TERMINAL_H
#define SENSOR_TAVIK_SRC_TERMINAL_H

#include <termios.h>

#include <cstddef>

#include "sensor/views/include/StatusView.h"

bool isOutputTerminal();

/// The terminal's size; without a terminal 80 by 24.
struct ZTSTerminalSize {
    std::size_t mColumns = 80;
    std::size_t mRows = 24;
};
ZTSTerminalSize getTerminalSize();

/// For text in the layout of a page: as wide as the terminal, else 80; colour only on a terminal, not with NO_COLOR and
/// not on one that is dumb.
ZTSTextStyle getPageStyle();

/// For tables: the terminal's width, else 0, no limit: a pipe gets all of it.
std::size_t getTableWidth();

/// Takes the terminal over for a live screen, and gives it back as it was: keys come at once and unseen, and what is
/// drawn is gone at the end. Standard input need not be a terminal: then no key comes.
class ZTCLiveScreen {
public:
    ZTCLiveScreen();
    ~ZTCLiveScreen();
    ZTCLiveScreen(const ZTCLiveScreen&) = delete;
    ZTCLiveScreen& operator=(const ZTCLiveScreen&) = delete;

    /// Replaces what is on the screen. Lines beyond its height are left out.
    static void draw(const std::string& acrText);

private:
    bool mHasKeys = false;
    termios mPrevious{};
};

#endif
