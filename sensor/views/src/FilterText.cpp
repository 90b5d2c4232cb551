#include "sensor/views/include/FilterText.h"

#include <algorithm>
#include <charconv>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/client/include/ClientErrors.h"
#include "sensor/settings/include/Quantities.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"

[[noreturn]] static void sFail(const std::string& acrOption, const std::string& acrText, const std::string& acrWanted) {
    throw ZTCBadFilterEx(acrOption + " \"" + escapeControls(acrText) + "\" is not " + acrWanted);
}

static std::optional<std::uint64_t> sParseNumber(const std::string& acrText, std::uint64_t aMost) {
    std::uint64_t lNumber = 0;
    const char* const lpEnd = acrText.data() + acrText.size();
    const auto [lpStop, lError] = std::from_chars(acrText.data(), lpEnd, lNumber);
    return lError == std::errc() && lpStop == lpEnd && lNumber <= aMost ? std::optional(lNumber) : std::nullopt;
}

static std::optional<std::chrono::microseconds> sParseSpan(const std::string& acrText) {
    try {
        return durationFromText(acrText);
    } catch (const ZTCBadInputEx&) {
        return std::nullopt;
    }
}

/// Throws ZTCBadFilterEx for a duration that is longer than the longest.
static void sRefuseTooLong(const std::string& acrText, const std::string& acrOption) {
    try {
        durationFromText(acrText);
    } catch (const ZTCTooLargeEx& lrEx) {
        throw ZTCBadFilterEx(acrOption + " " + lrEx.what());
    } catch (const ZTCBadInputEx&) {
        return;  // something else
    }
}

bool isTimeOrDuration(const std::string& acrText) {
    return sParseSpan(acrText) || parseLocalTime(acrText, getHistoryTime());
}

ZTCHistoryTime readPoint(const std::string& acrText, const std::string& acrOption, const std::vector<ZTSMark>& acrMarks,
                         ZTCHistoryTime aNow) {
    if (const auto lSpan = sParseSpan(acrText)) {
        return aNow - *lSpan;
    }
    if (const auto lTime = parseLocalTime(acrText, aNow)) {
        return *lTime;
    }
    const auto lMark = std::find_if(acrMarks.begin(), acrMarks.end(),
                                    [&acrText](const ZTSMark& acrMark) { return acrMark.mName == acrText; });
    if (lMark == acrMarks.end()) {
        sRefuseTooLong(acrText, acrOption);
        sFail(acrOption, acrText,
              "a time (\"2026-11-21 10:04\", \"10:04\"), a duration back from now (\"90s\", \"10m\", \"24h\", \"30d\") "
              "or "
              "the name of a mark");
    }
    return lMark->mTime;
}

void checkOrder(const char* apEarlier, ZTCHistoryTime aEarlier, const char* apLater, ZTCHistoryTime aLater) {
    if (aEarlier >= aLater) {
        throw ZTCBadFilterEx(std::string(apEarlier) + " has to be earlier than " + apLater + ", and " +
                             formatDateTime(aEarlier) + " is not earlier than " + formatDateTime(aLater));
    }
}

std::string listKinds() {
    std::string lText;
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        lText += (lText.empty() ? "" : ", ") + std::string(lrKind.mpName);
    }
    return lText;
}

/// "10m" (2026-11-21 09:54:12)
static std::string sPointText(const std::string& acrText, ZTCHistoryTime aTime) {
    return "\"" + escapeControls(acrText) + "\" (" + formatDateTime(aTime) + ")";
}

static constexpr std::uint64_t scMostLimit = 1'000'000'000'000;

static std::uint64_t sReadLimit(const ZTSFilterTexts& acrTexts) {
    const auto lLimit = sParseNumber(acrTexts.mLimit, scMostLimit);
    if (!lLimit) {
        sFail(acrTexts.mNamePrefix + "limit", acrTexts.mLimit, "a number from 0 (all) to 1000000000000");
    }
    return *lLimit;
}

static void sReadLun(const std::string& acrText, const std::string& acrPrefix, ZTSHistoryFilter& arFilter) {
    if (acrText == "all") {
        arFilter.mIsAllLuns = true;
        return;
    }
    const auto lLun = sParseNumber(acrText, 0xFFFFFFFEU);
    if (!lLun) {
        sFail(acrPrefix + "lun", acrText, "a number or \"all\"");
    }
    arFilter.mLuns.push_back(static_cast<std::uint32_t>(*lLun));
}

static ZTCKindKey sReadKind(const std::string& acrText, const std::string& acrPrefix) {
    const auto lKind = findKind(acrText);
    if (!lKind) {
        sFail(acrPrefix + "kind", acrText, "one of " + listKinds());
    }
    return *lKind;
}

void checkFilter(const ZTSFilterTexts& acrTexts) {
    ZTSHistoryFilter lFilter;
    for (const std::string& lrKind : acrTexts.mKinds) {
        sReadKind(lrKind, acrTexts.mNamePrefix);
    }
    for (const std::string& lrLun : acrTexts.mLuns) {
        sReadLun(lrLun, acrTexts.mNamePrefix, lFilter);
    }
    if (!acrTexts.mLimit.empty()) {
        sReadLimit(acrTexts);
    }
}

ZTSHistoryFilter readFilter(const ZTSFilterTexts& acrTexts, const ZTCNameBook& acrNames,
                            const std::vector<ZTSMark>& acrMarks, ZTCHistoryTime aNow, std::uint64_t aDefaultLimit) {
    ZTSHistoryFilter lFilter;
    const std::string& lrPrefix = acrTexts.mNamePrefix;
    if (!acrTexts.mSince.empty()) {
        lFilter.mSince = readPoint(acrTexts.mSince, lrPrefix + "since", acrMarks, aNow);
    }
    if (!acrTexts.mUntil.empty()) {
        lFilter.mUntil = readPoint(acrTexts.mUntil, lrPrefix + "until", acrMarks, aNow);
    }
    if (lFilter.mSince && lFilter.mUntil && *lFilter.mSince > *lFilter.mUntil) {
        throw ZTCBadFilterEx(lrPrefix + "since " + sPointText(acrTexts.mSince, *lFilter.mSince) + " is later than " +
                             lrPrefix + "until " + sPointText(acrTexts.mUntil, *lFilter.mUntil));
    }
    for (const std::string& lrKind : acrTexts.mKinds) {
        lFilter.mKinds.push_back(sReadKind(lrKind, lrPrefix));
    }
    for (const std::string& lrPort : acrTexts.mPorts) {
        const std::vector<ZTSFcName> lWwpns = acrNames.findRemotePorts(lrPort);
        if (lWwpns.empty()) {
            sFail(lrPrefix + "port", lrPort, "a WWPN, nor a name of a remote port (see tavik ports)");
        }
        lFilter.mPorts.insert(lFilter.mPorts.end(), lWwpns.begin(), lWwpns.end());
    }
    for (const std::string& lrInitiator : acrTexts.mInitiators) {
        const std::vector<ZTSFcName> lWwpns = acrNames.findInitiators(lrInitiator);
        if (lWwpns.empty()) {
            sFail(lrPrefix + "initiator", lrInitiator,
                  "a WWPN, nor a name or hostN of an adapter port (see tavik status)");
        }
        lFilter.mInitiators.insert(lFilter.mInitiators.end(), lWwpns.begin(), lWwpns.end());
    }
    for (const std::string& lrLun : acrTexts.mLuns) {
        sReadLun(lrLun, lrPrefix, lFilter);
    }
    lFilter.mIsOpenOnly = acrTexts.mIsOpenOnly;
    lFilter.mLimit = acrTexts.mLimit.empty() ? aDefaultLimit : sReadLimit(acrTexts);
    return lFilter;
}
