#include "sensor/tavik/src/Terminal.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdlib>
#include <string_view>

#include "sensor/tavik/src/Tavik.h"

bool isOutputTerminal() {
    return isatty(STDOUT_FILENO) == 1;
}

ZTSTerminalSize getTerminalSize() {
    ZTSTerminalSize lSize;
    winsize lWindow{};
    if (isOutputTerminal() && ioctl(STDOUT_FILENO, TIOCGWINSZ, &lWindow) == 0 && lWindow.ws_col != 0) {
        lSize.mColumns = lWindow.ws_col;
        lSize.mRows = lWindow.ws_row != 0 ? lWindow.ws_row : lSize.mRows;
    }
    return lSize;
}

static std::string_view sVariable(const char* apName) {
    const char* const lpValue = std::getenv(apName);
    return lpValue != nullptr ? lpValue : "";
}

ZTSTextStyle getPageStyle() {
    const bool lHasColor = isOutputTerminal() && sVariable("NO_COLOR").empty() && sVariable("TERM") != "dumb";
    return {.mWidth = getTerminalSize().mColumns, .mHasColor = lHasColor};
}

std::size_t getTableWidth() {
    return isOutputTerminal() ? getTerminalSize().mColumns : 0;
}

ZTCLiveScreen::ZTCLiveScreen() {
    if (tcgetattr(STDIN_FILENO, &mPrevious) == 0) {
        termios lRaw = mPrevious;
        lRaw.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
        mHasKeys = tcsetattr(STDIN_FILENO, TCSANOW, &lRaw) == 0;
    }
    writeOutput("\x1b[?1049h\x1b[?25l");  // the other screen, without a cursor
}

ZTCLiveScreen::~ZTCLiveScreen() {
    static constexpr std::string_view scLeave = "\x1b[?25h\x1b[?1049l";
    // A terminal that has gone needs nothing back.
    [[maybe_unused]] const ssize_t lWritten = write(STDOUT_FILENO, scLeave.data(), scLeave.size());
    if (mHasKeys) {
        tcsetattr(STDIN_FILENO, TCSANOW, &mPrevious);
    }
}

void ZTCLiveScreen::draw(const std::string& acrText) {
    const std::size_t lRows = getTerminalSize().mRows;
    std::string lScreen = "\x1b[H";
    std::string_view lRest = acrText;
    for (std::size_t i = 0; i < lRows && !lRest.empty(); ++i) {
        const std::size_t lEnd = std::min(lRest.find('\n'), lRest.size());
        lScreen += (i == 0 ? "" : "\r\n") + std::string(lRest.substr(0, lEnd)) + "\x1b[K";
        lRest.remove_prefix(std::min(lEnd + 1, lRest.size()));
    }
    writeOutput(lScreen + "\x1b[J");
}
