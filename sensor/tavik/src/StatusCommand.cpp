#include <poll.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <nlohmann/json.hpp>
#include <system_error>

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/Terminal.h"
#include "sensor/views/include/EpisodeText.h"

/// Between two looks of `--watch`.
static constexpr int scWatchMilliseconds = 1000;
/// Episodes that the live screen reads at most.
static constexpr std::uint64_t scMostWatchedEpisodes = 100;

/// The latest episodes, as many as fit.
static std::string sLatestEpisodes(const ZTCContext& acrContext, const ZTSStatusFacts& acrFacts, std::size_t aColumns,
                                   std::size_t aRows) {
    if (!acrFacts.mHistory || aRows < 2) {
        return {};
    }
    ZTCTextTable lTable = makeEpisodeTable(aColumns);
    ZTSHistoryFilter lFilter;
    lFilter.mLimit = std::min<std::uint64_t>(aRows - 1, scMostWatchedEpisodes);
    try {
        for (const ZTSEpisode& lrEpisode : acrContext.openHistory()->readEpisodes(lFilter)) {
            addRow(lTable, lrEpisode, acrFacts.mNames, acrFacts.mNow);
        }
    } catch (const ZTCStoreEx&) {
        return {};  // the status above says what is wrong with the history
    }
    return lTable.countRows() == 0 ? "No event has been stored yet.\n" : lTable.takeText();
}

/// The status, the latest episodes, and at the bottom how to leave.
static std::string sScreen(const ZTCContext& acrContext, const ZTSStatusFacts& acrFacts) {
    static constexpr std::size_t scMargin = 2;  // an empty line above the episodes, and the last line
    const ZTSTerminalSize lSize = getTerminalSize();
    std::string lText = formatStatus(acrFacts, getPageStyle());
    const auto lUsed = static_cast<std::size_t>(std::count(lText.begin(), lText.end(), '\n'));
    if (lUsed + scMargin < lSize.mRows) {
        lText += "\n" + sLatestEpisodes(acrContext, acrFacts, lSize.mColumns, lSize.mRows - lUsed - scMargin);
    }
    const auto lLines = static_cast<std::size_t>(std::count(lText.begin(), lText.end(), '\n'));
    lText.append(lSize.mRows > lLines + 1 ? lSize.mRows - lLines - 1 : 0, '\n');
    return lText + "q: quit";
}

/// Whether the next second is to be waited for: false after a key `q`, the end of the keys' source, or a signal.
static bool sWaitForNextLook(int aSignals, bool& arHasKeys) {
    std::array<pollfd, 2> lSources{{{.fd = aSignals, .events = POLLIN, .revents = 0},
                                    {.fd = arHasKeys ? STDIN_FILENO : -1, .events = POLLIN, .revents = 0}}};
    if (poll(lSources.data(), lSources.size(), scWatchMilliseconds) <= 0) {
        return true;
    }
    signalfd_siginfo lSignal{};
    if (lSources[0].revents != 0 && read(aSignals, &lSignal, sizeof(lSignal)) == sizeof(lSignal)) {
        return lSignal.ssi_signo == SIGWINCH;
    }
    char lKey = '\0';
    if (lSources[1].revents != 0) {
        arHasKeys = read(STDIN_FILENO, &lKey, 1) == 1;
    }
    return lKey != 'q' && lKey != 'Q';
}

static int sWatch(const ZTCContext& acrContext) {
    if (!isOutputTerminal()) {
        throw ZTCWrongUseEx("status --watch needs a terminal; without one use tavik status, or tavik events --follow");
    }
    sigset_t lSignals;
    sigemptyset(&lSignals);
    for (const int lSignal : {SIGINT, SIGTERM, SIGHUP, SIGWINCH, SIGTSTP}) {
        sigaddset(&lSignals, lSignal);
    }
    sigprocmask(SIG_BLOCK, &lSignals, nullptr);
    const ZTCFileDescriptor lSignalFd(signalfd(-1, &lSignals, SFD_CLOEXEC | SFD_NONBLOCK));
    if (!lSignalFd.isOpen()) {
        throw std::system_error(errno, std::generic_category(), "cannot wait for signals");
    }
    const ZTCLiveScreen lScreen;
    bool lHasKeys = isatty(STDIN_FILENO) == 1;
    int lExit = ZTTX_Done;
    do {
        const ZTSStatusFacts lFacts = acrContext.gatherFacts();
        ZTCLiveScreen::draw(sScreen(acrContext, lFacts));
        lExit = judge(lFacts).getExit();
    } while (sWaitForNextLook(lSignalFd.get(), lHasKeys));
    return lExit;
}

int runStatus(const ZTSTavikOptions& acrOptions) {
    if (acrOptions.mIsWatch && acrOptions.mIsJson) {
        throw ZTCWrongUseEx("--watch draws a screen: it does not go with --json");
    }
    const ZTCContext lContext(acrOptions);
    if (acrOptions.mIsWatch) {
        return sWatch(lContext);
    }
    const ZTSStatusFacts lFacts = lContext.gatherFacts();
    if (acrOptions.mIsJson) {
        writeDocument(makeStatusDocument(lFacts));
    } else {
        writeOutput(formatStatus(lFacts, getPageStyle()));
    }
    return judge(lFacts).getExit();
}
