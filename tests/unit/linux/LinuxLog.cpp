#include "tests/unit/linux/LinuxLog.h"

#include <algorithm>
#include <map>
#include <mutex>

#include "libkpm/common/include/AgentLink.h"

struct ZTSToldSource {
    std::uint32_t mBoard;
    std::uint32_t mCategory;
    std::uint32_t mSubcategory;
    std::string mText;
};

static std::mutex sLogLock;
static std::vector<std::string>& sLines() {
    static std::vector<std::string>& srLines = *new std::vector<std::string>;
    return srLines;
}
static std::vector<ZTSToldSource>& sSources() {
    static std::vector<ZTSToldSource>& srSources = *new std::vector<ZTSToldSource>;
    return srSources;
}
static std::map<std::string, std::uint64_t>& sLosses() {
    static std::map<std::string, std::uint64_t>& srLosses = *new std::map<std::string, std::uint64_t>;
    return srLosses;
}

static void sLog(std::uint32_t aLevel, const char* apText) {
    const ZTCTestsOwn lOwn;
    const std::lock_guard<std::mutex> lGuard(sLogLock);
    sLines().push_back(std::to_string(aLevel) + " " + apText);
}

static void sState(void*, std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory,
                   std::uint32_t aState, const char* apReason) {
    const ZTCTestsOwn lOwn;
    static constexpr const char* scStates[] = {"?", "working", "no source", "no rights", "failed"};
    const std::lock_guard<std::mutex> lGuard(sLogLock);
    const std::string lReason = *apReason == '\0' ? std::string() : std::string(" (") + apReason + ")";
    sSources().push_back(
        {aBoard, aCategory, aSubcategory, scStates[aState <= KPM_STATE_FAILED ? aState : 0] + lReason});
}

static void sLoss(void*, const char* apName, std::uint64_t aTotal) {
    const ZTCTestsOwn lOwn;
    const std::lock_guard<std::mutex> lGuard(sLogLock);
    sLosses()[apName] = aTotal;
}

ZTCLinuxLog::ZTCLinuxLog() {
    {
        const std::lock_guard<std::mutex> lGuard(sLogLock);
        sLines().clear();
        sSources().clear();
        sLosses().clear();
    }
    setLibraryLog(&sLog);
    setLibraryReport(nullptr, &sState, &sLoss);
}

ZTCLinuxLog::~ZTCLinuxLog() {
    setLibraryLog(nullptr);
    setLibraryReport(nullptr, nullptr, nullptr);
}

std::vector<std::string> ZTCLinuxLog::sources(std::uint32_t aBoard, std::uint32_t aCategory,
                                              std::uint32_t aSubcategory) const {
    const std::lock_guard<std::mutex> lGuard(sLogLock);
    std::vector<std::string> lTold;
    for (const ZTSToldSource& lrSource : sSources()) {
        if (lrSource.mBoard == aBoard && lrSource.mCategory == aCategory && lrSource.mSubcategory == aSubcategory) {
            lTold.push_back(lrSource.mText);
        }
    }
    return lTold;
}

std::string ZTCLinuxLog::source(std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory) const {
    const std::vector<std::string> lTold = sources(aBoard, aCategory, aSubcategory);
    return lTold.empty() ? std::string() : lTold.back();
}

std::optional<std::uint64_t> ZTCLinuxLog::loss(const std::string& acrName) const {
    const std::lock_guard<std::mutex> lGuard(sLogLock);
    const auto lFound = sLosses().find(acrName);
    return lFound == sLosses().end() ? std::nullopt : std::optional(lFound->second);
}

std::vector<std::string> ZTCLinuxLog::lines() const {
    const std::lock_guard<std::mutex> lGuard(sLogLock);
    return sLines();
}

std::size_t ZTCLinuxLog::count(const std::string& acrText) const {
    const std::vector<std::string> lLines = lines();
    return static_cast<std::size_t>(std::count_if(lLines.begin(), lLines.end(), [&](const std::string& acrLine) {
        return acrLine.find(acrText) != std::string::npos;
    }));
}

std::string ZTCLinuxLog::all() const {
    std::string lText;
    for (const std::string& lrLine : lines()) {
        lText += lrLine + "\n";
    }
    return lText;
}
