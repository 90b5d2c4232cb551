#include <unistd.h>

#include <cerrno>

#include "sensor/client/include/RecordTable.h"
#include "sensor/client/src/Tavikctl.h"

void complain(const std::string& acrText) {
    const std::string lLine = "tavikctl: " + escapeText(acrText) + "\n";
    // Nothing can be said about a standard error that does not take the line.
    [[maybe_unused]] const ssize_t lWritten = write(STDERR_FILENO, lLine.data(), lLine.size());
}

void writeOutput(const std::string& acrText) {
    std::size_t lWritten = 0;
    while (lWritten < acrText.size()) {
        const ssize_t lCount = write(STDOUT_FILENO, acrText.data() + lWritten, acrText.size() - lWritten);
        if (lCount > 0) {
            lWritten += static_cast<std::size_t>(lCount);
        } else if (lCount < 0 && errno == EINTR) {
            continue;
        } else {
            throw ZTCSystemCallEx("cannot write standard output: " + std::to_string(lWritten) + " of " +
                                      std::to_string(acrText.size()) + " bytes written",
                                  lCount < 0 ? errno : ENOSPC);
        }
    }
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
                 " bytes behind its last field, which are ignored");
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
