#include "sensor/warnings/include/WarnDocument.h"

#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordJson.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/TimeText.h"

using ZTCJson = nlohmann::ordered_json;

static ZTCJson sText(const std::string& acrText) {
    return acrText.empty() ? ZTCJson(nullptr) : ZTCJson(acrText);
}

static double sSeconds(std::chrono::milliseconds aTime) {
    return static_cast<double>(aTime.count()) / 1000;
}

static std::string sSecondsText(std::chrono::milliseconds aTime) {
    return ZTCJson(sSeconds(aTime)).dump();
}

static bool sIsOfPort(const ZTSWarnRule& acrRule, const ZTSTrouble& acrTrouble) {
    return acrRule.mPer == "port" && acrTrouble.mRemotePort;
}

static bool sIsOfInitiator(const ZTSWarnRule& acrRule, const ZTSTrouble& acrTrouble) {
    return acrRule.mPer != "host" && acrTrouble.mInitiator.mWwpn;
}

std::string describeTrouble(const ZTSWarnRule& acrRule, const ZTSTrouble& acrTrouble, const ZTCNameBook& acrNames) {
    std::string lText = acrRule.mKind;
    if (sIsOfPort(acrRule, acrTrouble)) {
        lText += " of " + acrNames.describe(*acrTrouble.mRemotePort);
    } else if (sIsOfInitiator(acrRule, acrTrouble)) {
        lText += " of " + acrNames.describe(acrTrouble.mInitiator);
    }
    if (acrTrouble.mCount != 0) {
        lText += ": " + std::to_string(acrTrouble.mCount) + " within " + sSecondsText(acrRule.mWithin) + " s";
    }
    return acrTrouble.mText.empty() ? lText : lText + ", " + acrTrouble.mText;
}

static ZTCJson sWarning(const ZTSWarnDocument& acrDocument, const ZTCNameBook& acrNames) {
    const ZTSTrouble& lrTrouble = acrDocument.mTrouble;
    return {{"text", describeTrouble(acrDocument.mRule, lrTrouble, acrNames)},
            {"count", lrTrouble.mCount},
            {"within", sSeconds(acrDocument.mRule.mWithin)},
            {"per", acrDocument.mRule.mPer},
            {"first", toRfc3339(lrTrouble.mFirst)},
            {"previous", lrTrouble.mWarnings},
            {"next", acrDocument.mIsTest ? ZTCJson(nullptr) : ZTCJson(toRfc3339(lrTrouble.mNext))},
            {"test", acrDocument.mIsTest}};
}

std::string toHookInput(const ZTSWarnDocument& acrDocument, const ZTCNameBook& acrNames) {
    const ZTSTrouble& lrTrouble = acrDocument.mTrouble;
    ZTCJson lDocument{{"host", acrDocument.mHost}, {"storeId", sText(acrDocument.mStoreId)}};
    if (acrDocument.mEpisode) {
        lDocument.update(toJson(*acrDocument.mEpisode, acrNames));
    } else {
        const bool lHasInitiator = sIsOfInitiator(acrDocument.mRule, lrTrouble);
        const bool lHasPort = sIsOfPort(acrDocument.mRule, lrTrouble);
        lDocument.update(ZTCJson{{"seq", nullptr},
                                 {"episode", nullptr},
                                 {"phase", nullptr},
                                 {"kind", acrDocument.mRule.mKind},
                                 {"initiator", lHasInitiator ? toJson(lrTrouble.mInitiator) : ZTCJson(nullptr)},
                                 {"remotePort", lHasPort ? toJson(lrTrouble.mRemotePort, acrNames) : ZTCJson(nullptr)},
                                 {"count", lrTrouble.mCount},
                                 {"first", toRfc3339(lrTrouble.mFirst)},
                                 {"last", toRfc3339(lrTrouble.mLast)},
                                 {"luns", nullptr},
                                 {"detail", ZTCJson::object()}});
    }
    lDocument["warning"] = sWarning(acrDocument, acrNames);
    return dumpJson(lDocument, -1) + "\n";
}

std::vector<std::string> toHookEnvironment(const ZTSWarnDocument& acrDocument, const ZTCNameBook& acrNames) {
    const ZTSTrouble& lrTrouble = acrDocument.mTrouble;
    const std::optional<ZTSEpisode>& lrEpisode = acrDocument.mEpisode;
    std::vector<std::string> lVariables;
    const auto lAdd = [&lVariables](const char* apName, const std::string& acrValue) {
        lVariables.push_back(std::string("TAVIK_") + apName + "=" + acrValue);
    };
    const bool lHasInitiator = sIsOfInitiator(acrDocument.mRule, lrTrouble);
    const bool lHasPort = sIsOfPort(acrDocument.mRule, lrTrouble);
    lAdd("TEST", acrDocument.mIsTest ? "1" : "0");
    lAdd("HOST", acrDocument.mHost);
    lAdd("STORE_ID", acrDocument.mStoreId);
    lAdd("KIND", acrDocument.mRule.mKind);
    lAdd("TEXT", describeTrouble(acrDocument.mRule, lrTrouble, acrNames));
    lAdd("COUNT", std::to_string(lrTrouble.mCount));
    lAdd("WITHIN", sSecondsText(acrDocument.mRule.mWithin));
    lAdd("PER", acrDocument.mRule.mPer);
    lAdd("INITIATOR", lHasInitiator ? lrTrouble.mInitiator.mWwpn->toText() : "");
    lAdd("INITIATOR_HOST", lHasInitiator ? lrTrouble.mInitiator.mHost : "");
    lAdd("REMOTE_PORT", lHasPort ? lrTrouble.mRemotePort->mWwpn.toText() : "");
    lAdd("REMOTE_PORT_NAME",
         lHasPort ? acrNames.findName(lrTrouble.mRemotePort->mWwpn, lrTrouble.mRemotePort->mWwnn) : "");
    lAdd("FIRST", toRfc3339(lrTrouble.mFirst));
    lAdd("LAST", toRfc3339(lrTrouble.mLast));
    lAdd("PREVIOUS", std::to_string(lrTrouble.mWarnings));
    lAdd("NEXT", acrDocument.mIsTest ? "" : toRfc3339(lrTrouble.mNext));
    lAdd("SEQ", lrEpisode ? std::to_string(lrEpisode->mSeq) : "");
    lAdd("EPISODE", lrEpisode ? std::to_string(lrEpisode->mEpisode) : "");
    lAdd("PHASE", lrEpisode ? getPhaseName(lrEpisode->mPhase) : "");
    return lVariables;
}
