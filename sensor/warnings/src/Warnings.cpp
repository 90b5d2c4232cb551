#include "sensor/warnings/include/Warnings.h"

#include <algorithm>
#include <cerrno>
#include <limits>
#include <nlohmann/json.hpp>
#include <sstream>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/views/include/SanView.h"
#include "sensor/views/include/TimeText.h"

using std::chrono::milliseconds;
using std::chrono::seconds;
using std::chrono::steady_clock;
using ZTCJson = nlohmann::ordered_json;

/// Between two looks while any trouble is known.
static constexpr seconds scLookPeriod{1};
/// Between two looks at the paths.
static constexpr seconds scSanPeriod{10};
/// The history has what an earlier process has warned of. This is how long the thread waits for the history.
static constexpr seconds scHistoryPatience{10};
/// For a test beside the timeouts of its hooks.
static constexpr seconds scTestMargin{5};

ZTCWarnings::ZTCWarnings(ZTSWarningsSetup aSetup, const ZTSSettings& acrSettings)
    : mSetup(std::move(aSetup)), mStart(steady_clock::now()) {
    setSettings(acrSettings);
    mThread = std::thread([this] { run(); });
}

ZTCWarnings::~ZTCWarnings() {
    {
        const std::lock_guard lLock(mMutex);
        mIsStopping = true;
    }
    mWakeUp.ring();
    mThread.join();
}

// ---- any thread ----

void ZTCWarnings::setSettings(const ZTSSettings& acrSettings) {
    {
        const std::lock_guard lLock(mMutex);
        mNewSettings = acrSettings;
        mHasRules = !acrSettings.mWarnings.empty();
        mTestTime = scTestMargin;
        for (const ZTSWarnRule& lrRule : acrSettings.mWarnings) {
            mTestTime += 2 * lrRule.mTimeout;  // a hook of a real trouble may run before it
        }
    }
    mWakeUp.ring();
}

void ZTCWarnings::setLive(std::string aLive) {
    {
        const std::lock_guard lLock(mMutex);
        mNewLive = std::move(aLive);
        if (!mHasRules) {
            return;
        }
    }
    mWakeUp.ring();
}

void ZTCWarnings::openHistory() {
    const std::lock_guard lLock(mMutex);
    mMayRead = true;
}

milliseconds ZTCWarnings::test(std::uint64_t aTicket) {
    milliseconds lTime{};
    {
        const std::lock_guard lLock(mMutex);
        mNewTests.push_back(aTicket);
        lTime = mTestTime;
    }
    mWakeUp.ring();
    return lTime;
}

std::vector<ZTSHookTest> ZTCWarnings::takeTests() {
    mBell.clear();
    const std::lock_guard lLock(mMutex);
    return std::exchange(mDoneTests, {});
}

std::string ZTCWarnings::describe() const {
    const std::lock_guard lLock(mMutex);
    return mDescription;
}

// ---- the thread ----

void ZTCWarnings::run() {
    applySettings();
    while (wait()) {
        applySettings();
        readHistory();
        readLive();
        stepHooks();
        warn();
        beginTest();
        startHooks();
        save();
        publish();
    }
    mHooks.clear();
    save();
}

/// False: it is over.
bool ZTCWarnings::wait() {
    std::vector<pollfd> lFds{{.fd = mWakeUp.getDescriptor(), .events = POLLIN, .revents = 0}};
    const auto lNow = steady_clock::now();
    auto lNext = mpBook->isEmpty() ? steady_clock::time_point::max() : lNow + scLookPeriod;
    for (const ZTSHook& lrHook : mHooks) {
        if (lrHook.mpProcess != nullptr) {
            lrHook.mpProcess->addTo(lFds);
            lNext = std::min(lNext, lrHook.mpProcess->getNextStep(lNow));
        }
    }
    const auto lTime = std::chrono::ceil<milliseconds>(lNext - lNow).count();
    const bool lIsEndless = lNext == steady_clock::time_point::max();
    poll(lFds.data(), static_cast<nfds_t>(lFds.size()),
         lIsEndless ? -1 : static_cast<int>(std::clamp<long long>(lTime, 0, 60000)));
    mWakeUp.clear();
    const std::lock_guard lLock(mMutex);
    return !mIsStopping;
}

void ZTCWarnings::applySettings() {
    const std::lock_guard lLock(mMutex);
    std::optional<ZTSSettings> lNew;
    lNew.swap(mNewSettings);
    if (!lNew) {
        return;
    }
    const bool lIsNew = mpBook == nullptr || lNew->mWarnings != mSettings.mWarnings;
    mSettings = std::move(*lNew);
    if (!lIsNew) {
        return;
    }
    const std::string lOpen = mpBook != nullptr ? mpBook->toText() : std::string();
    mpBook = std::make_unique<ZTCWarnBook>(mSettings.mWarnings);
    mpBook->load(lOpen);
    mpSource = std::make_unique<ZTCWarnSource>(mSettings.mWarnings);
    mProblems.assign(mSettings.mWarnings.size(), {});
    if (mTest) {
        mDoneTests.push_back(
            {mTest->mTicket, dumpJson({{"error", "the settings have changed while the hooks were tested"}}, -1)});
        mTest.reset();
        mBell.ring();
    }
}

void ZTCWarnings::readHistory() {
    {
        const std::lock_guard lLock(mMutex);
        if (!mMayRead) {
            return;
        }
    }
    try {
        if (mpHistory == nullptr) {
            mpHistory = std::make_unique<ZTCHistory>(mSetup.mStateDirectory);
        }
        if (!mIsLoaded) {
            mIsLoaded = true;
            if (!mpBook->load(mpHistory->getValue(gcWarnBookValue))) {
                mSetup.mReport(
                    "the open troubles in the history cannot be read: their warnings start again from the first");
            }
            const std::uint64_t lBefore = std::exchange(mFailures, 0);
            std::istringstream(mpHistory->getValue(mSetup.mFailuresValue)) >> mFailures;
            mFailures += lBefore;
            if (lBefore != 0) {
                mSetup.mSetValue(mSetup.mFailuresValue, std::to_string(mFailures));
            }
        }
        if (mpBook->getRules().empty()) {
            return;
        }
        readSanFacts();
        for (const ZTSWarnOccurrence& lrOccurrence : mpSource->read(*mpHistory, getHistoryTime())) {
            mpBook->note(lrOccurrence);
        }
        for (const auto& [lName, lValue] : mpSource->takeValues()) {
            mSetup.mSetValue(lName, lValue);
        }
    } catch (const ZTCStoreEx&) {
        mpHistory.reset();  // `status` says what is wrong with it; it is opened again at the next look
    }
}

/// The paths, where a rule asks for them: not at every look, since a large host has thousands.
void ZTCWarnings::readSanFacts() {
    const auto lIsPaths = [](const ZTSWarnRule& acrRule) { return acrRule.mKind == "path-lost"; };
    const auto lNow = steady_clock::now();
    if (std::ranges::any_of(mpBook->getRules(), lIsPaths) && lNow >= mNextSan) {
        mNextSan = lNow + scSanPeriod;
        std::optional<ZTSSanView> lView = readSan(*mpHistory, getHistoryTime());
        mSan = lView ? std::optional(std::move(lView->mFacts)) : std::nullopt;
    }
}

void ZTCWarnings::readLive() {
    std::optional<std::string> lNew;
    {
        const std::lock_guard lLock(mMutex);
        lNew.swap(mNewLive);
    }
    if (lNew && !mpBook->getRules().empty()) {
        mLive = readLiveState(nlohmann::json::parse(*lNew, nullptr, false));
        mHasLive = true;
    }
}

void ZTCWarnings::warn() {
    if (!mIsLoaded && steady_clock::now() - mStart < scHistoryPatience) {
        return;
    }
    const ZTCHistoryTime lNow = getHistoryTime();
    if (mHasLive) {
        mpBook->setHolding(ZTCWarnSource::findHolding(mLive, mSan ? &*mSan : nullptr, lNow));
    }
    std::vector<std::string> lLines;
    mpBook->judge(
        lNow,
        [this](const std::string& acrKind) {
            return ZTCWarnSource::isState(acrKind) ? ZTCWarnSource::isKnown(mLive, mSan ? &*mSan : nullptr, acrKind)
                                                   : mpSource->hasRead();
        },
        lLines);
    for (const std::string& lrLine : lLines) {
        mSetup.mReport(lrLine);
    }
    const std::size_t lRoom = gcMostHooks - std::min(gcMostHooks, mHooks.size());
    const ZTCNameBook lNames = makeNames();
    for (const ZTSTrouble& lrTrouble : mpBook->takeDue(lNow, lRoom)) {
        const ZTSWarnDocument lDocument = makeDocument(lrTrouble);
        ZTSHook& lrHook = mHooks.emplace_back();
        lrHook.mSettings = lDocument.mRule;
        lrHook.mRule = lrTrouble.mRule;
        lrHook.mInput = makeInput(lDocument);
        lrHook.mEnvironment = toHookEnvironment(lDocument, lNames);
        mSetup.mReport("warning: " + describeTrouble(lDocument.mRule, lrTrouble, lNames) + "; " +
                       lDocument.mRule.mRun.front() + " is run, and again at " + toRfc3339(lrTrouble.mNext) +
                       " if it goes on");
    }
}

ZTCNameBook ZTCWarnings::makeNames() const {
    ZTCNameBook lNames;
    lNames.addNames(mSettings.mNames);
    return lNames;
}

/// With the devices of the episode, where the history can say them.
std::string ZTCWarnings::makeInput(const ZTSWarnDocument& acrDocument) {
    ZTCNameBook lNames = makeNames();
    if (mpHistory != nullptr) {
        lNames.setTopology(readTopologyOf(*mpHistory));
    }
    try {
        return toHookInput(acrDocument, lNames);
    } catch (const ZTCStoreEx&) {
        mpHistory.reset();
        return toHookInput(acrDocument, makeNames());
    }
}

void ZTCWarnings::save() {
    const std::string lText = mpBook->toText();
    if (mIsLoaded && lText != mSaved) {
        mSetup.mSetValue(gcWarnBookValue, lText);
        mSaved = lText;
    }
}

void ZTCWarnings::publish() {
    ZTCJson lWarnings = ZTCJson::array();
    const ZTCNameBook lNames = makeNames();
    for (const ZTSTrouble& lrTrouble : mpBook->getOpen()) {
        const ZTSWarnRule& lrRule = mpBook->getRule(lrTrouble.mRule);
        lWarnings.push_back({{"kind", lrRule.mKind},
                             {"text", describeTrouble(lrRule, lrTrouble, lNames)},
                             {"since", toRfc3339(lrTrouble.mFirst)},
                             {"given", lrTrouble.mWarnings},
                             {"next", toRfc3339(lrTrouble.mNext)}});
    }
    for (std::size_t i = 0; i < mProblems.size(); ++i) {
        if (!mProblems[i].empty()) {
            const ZTSWarnRule& lrRule = mSettings.mWarnings[i];
            lWarnings.push_back(
                {{"kind", "hook"},
                 {"text", "the hook " + lrRule.mRun.front() + " for " + lrRule.mKind + " failed: " + mProblems[i]},
                 {"since", nullptr},
                 {"given", nullptr},
                 {"next", nullptr}});
        }
    }
    std::string lText = dumpJson(lWarnings, -1);
    const std::lock_guard lLock(mMutex);
    mDescription = std::move(lText);
}
