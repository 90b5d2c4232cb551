#include "tests/soak/SoakFigures.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>

namespace {

// Two files, each up to its bound, and the FIFOs and pid files beside them.
constexpr std::int64_t scMostDisk = 2 * 64 * 1024 + 64;

// What the allocator may come to keep when threads meet in new ways; a leak passes it in the course of a long run, and
// the blocks show it in a short one.
constexpr std::int64_t scMostMemoryGrowth = 2048;

std::int64_t sNumberOfEntries(const std::string& acrDirectory) {
    const std::filesystem::directory_iterator lAll(acrDirectory);
    return std::distance(begin(lAll), end(lAll));
}

std::vector<std::int64_t> sQuarter(const std::vector<ZTSSoakFigures>& acrFigures, double aSeconds, int aQuarter,
                                   std::int64_t ZTSSoakFigures::*apFigure) {
    std::vector<std::int64_t> lValues;
    for (const ZTSSoakFigures& lcrFigures : acrFigures) {
        const int lQuarter = std::min(3, static_cast<int>(lcrFigures.mSeconds / aSeconds * 4));
        if (lQuarter == aQuarter) {
            lValues.push_back(lcrFigures.*apFigure);
        }
    }
    if (lValues.empty()) {
        throw std::runtime_error("no figures from quarter " + std::to_string(aQuarter + 1) + " of the time");
    }
    std::sort(lValues.begin(), lValues.end());
    return lValues;
}

}  // namespace

ZTSSoakFigures takeSoakFigures(pid_t aPid, const std::vector<std::string>& acrFiles) {
    const std::string lProcess = "/proc/" + std::to_string(aPid);
    ZTSSoakFigures lFigures;
    std::ifstream lRollup(lProcess + "/smaps_rollup");
    for (std::string lLine; std::getline(lRollup, lLine);) {
        std::istringstream lWords(lLine);
        std::string lName;
        std::int64_t lValue = 0;
        lWords >> lName >> lValue;
        if (lName == "Rss:") {
            lFigures.mRss = lValue;
        } else if (lName == "Pss:") {
            lFigures.mPss = lValue;
        }
    }
    if (lFigures.mRss == 0) {
        throw std::runtime_error("process " + std::to_string(aPid) + " tells nothing of its memory");
    }
    lFigures.mDescriptors = sNumberOfEntries(lProcess + "/fd");
    lFigures.mThreads = sNumberOfEntries(lProcess + "/task");
    for (const std::string& lcrFile : acrFiles) {
        std::error_code lError;
        const auto lSize = std::filesystem::file_size(lcrFile, lError);
        lFigures.mDisk += lError ? 0 : static_cast<std::int64_t>(lSize) / 1024;
    }
    return lFigures;
}

std::vector<ZTSSoakVerdict> judgeSoak(const std::vector<ZTSSoakFigures>& acrFigures, double aSeconds) {
    const auto lOver = [&](int aQuarter, std::int64_t ZTSSoakFigures::*apFigure) {
        return sQuarter(acrFigures, aSeconds, aQuarter, apFigure);
    };
    const auto lMedians = [&](const char* apName, std::int64_t ZTSSoakFigures::*apFigure) {
        const auto lMedian = [](const std::vector<std::int64_t>& acrValues) { return acrValues[acrValues.size() / 2]; };
        const std::int64_t lBegin = lMedian(lOver(1, apFigure));
        return ZTSSoakVerdict{apName, lBegin, lMedian(lOver(2, apFigure)), lMedian(lOver(3, apFigure)),
                              lBegin + std::max(scMostMemoryGrowth, lBegin / 10)};
    };
    // Of these the agent has a number of its own when it has nothing to do: the least of them that was ever seen.
    const auto lLeasts = [&](const char* apName, std::int64_t ZTSSoakFigures::*apFigure, std::int64_t aMargin) {
        const std::int64_t lBegin = lOver(1, apFigure).front();
        return ZTSSoakVerdict{apName, lBegin, lOver(2, apFigure).front(), lOver(3, apFigure).front(), lBegin + aMargin};
    };
    const ZTSSoakVerdict lDisk{"disk, KiB", lOver(1, &ZTSSoakFigures::mDisk).back(),
                               lOver(2, &ZTSSoakFigures::mDisk).back(), lOver(3, &ZTSSoakFigures::mDisk).back(),
                               scMostDisk};
    return {lMedians("RSS, KiB", &ZTSSoakFigures::mRss),
            lMedians("PSS, KiB", &ZTSSoakFigures::mPss),
            lLeasts("blocks of memory", &ZTSSoakFigures::mBlocks, 0),
            lLeasts("descriptors", &ZTSSoakFigures::mDescriptors, 0),
            lLeasts("threads", &ZTSSoakFigures::mThreads, 0),
            lDisk};
}
