#include <limits.h>
#include <poll.h>
#include <unistd.h>

#include "sensor/client/include/RecordTable.h"
#include "sensor/client/src/Tavikctl.h"

void complain(const std::string& acrText) {
    const std::string lLine = "tavikctl: " + escapeText(acrText) + "\n";
    // Nothing can be said about a standard error that does not take the line.
    [[maybe_unused]] const ssize_t lWritten = write(STDERR_FILENO, lLine.data(), lLine.size());
}

bool writeOutputPatiently(const std::string& acrText, const std::function<bool()>& acrPause) {
    static constexpr int scPauseMilliseconds = 1000;
    for (std::size_t lWritten = 0; lWritten < acrText.size();) {
        pollfd lOutput{.fd = STDOUT_FILENO, .events = POLLOUT, .revents = 0};
        const bool lIsReady = poll(&lOutput, 1, scPauseMilliseconds) > 0;
        const bool lMayGoOn = acrPause();
        if (lIsReady) {
            // A pipe that is ready takes this much without blocking.
            lWritten += writeSomeOutput(acrText, lWritten, PIPE_BUF);
        } else if (!lMayGoOn) {
            return false;
        }
    }
    return true;
}

ZTEExitStatus reportAnswer(const ZTSToolOptions& acrOptions, const std::string& acrCommand,
                           const ZTSAnswer& acrAnswer) {
    const ZTSResponse& lrResponse = acrAnswer.getResponse();
    if (acrAnswer.mDecoded.mProblem) {
        complain(acrCommand + ": the answer of " + std::to_string(acrAnswer.mBody.size()) +
                 " bytes cannot be decoded to its end: " + acrAnswer.mDecoded.mProblem->what());
        return ZTXS_NoAnswer;
    }
    if (lrResponse.mUnreadBytes != 0) {
        complain(acrCommand + ": the answer has " + std::to_string(lrResponse.mUnreadBytes) +
                 " bytes after its last field, which are ignored");
    }
    if (lrResponse.mOutcome == ZTRO_Failed) {
        complain("the agent in " + acrOptions.mDirectory + " refused " + acrCommand + ": status " +
                 std::to_string(lrResponse.mStatus) + " " + getStatusName(lrResponse.mStatus));
        return ZTXS_Refused;
    }
    if (lrResponse.mLists.size() < lrResponse.mAnnouncedLists) {
        complain(acrCommand + ": the agent announced " + std::to_string(lrResponse.mAnnouncedLists) +
                 " lists and sent " + std::to_string(lrResponse.mLists.size()) +
                 ": it skips a board whose initiator it does not know");
    }
    return ZTXS_Done;
}
