#include "tests/support/LogTextsSeen.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstring>
#include <functional>
#include <new>
#include <stdexcept>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "os/common/include/Conditional.h"
#include "os/common/include/Mutex.h"
#include "os/common/include/Os.h"
#include "system/include/SynchList.h"
#include "system/include/SystemGlobals.h"
#include "tavik/include/TavikCommandHandler.h"
#include "tavik/include/TavikCore.h"
#include "tavik/include/TavikHeartbeatHandler.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"
#include "tests/unit/logtexts/support/Interposed.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/TestSystem.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

/// An object whose bytes are what the test says and whose constructor never ran, as no code can have it by right.
template <typename TObject>
class ZTCForgedObject {
public:
    explicit ZTCForgedObject(const void* apFirstWord = nullptr) {
        std::memcpy(mBytes, &apFirstWord, sizeof apFirstWord);
    }
    TObject& get() { return *std::launder(reinterpret_cast<TObject*>(mBytes)); }

private:
    alignas(TObject) unsigned char mBytes[sizeof(TObject)] = {};
};

using ZTCIntPointer = ZTCPointer<int>;

struct ZTSBase {
    virtual ~ZTSBase() = default;
};
struct ZTSDerived : ZTSBase {};

class ZTCConditionalDestroyedBefore : public ZTCConditional {
public:
    ~ZTCConditionalDestroyedBefore() override { OsDestroyConditional(getOsConditional()); }
};

/// A system of which one operation or another fails.
class ZTCFailingSystem : public ZTCTestSystem {
public:
    using ZTCTestSystem::ZTCTestSystem;

    bool mFailsToStartThreads = false;

    void init() override { throw ZTCInvalidEx("init fails"); }
    void destroyThreads() override {
        if (!mFailsToStartThreads) {
            throw ZTCOsThreadEx("destroyThreads fails");
        }
    }
    void startThread(unsigned) override { throw ZTCOsThreadEx("startThread fails"); }
};

/// Every text that no path of the agent leads to, each driven in a copy of this process, which may end by it, and whose
/// log all copies share.
class LogTexts : public ZTCTavikFixture {
protected:
    /// Runs something with everything logged; the copy has to end with this status.
    void drive(int aStatus, const char* apWhat, const std::function<void()>& acrDo) {
        unlink(responseFifoPath().c_str());
        ZTCForkedProcess lChild(
            [&](ZTCForkedProcess&) {
                setLogFilePath(mTextsPath.c_str());
                setLogCode(255);
                acrDo();
                return 0;
            },
            mDirectory.path("child"));
        EXPECT_EQ(aStatus, lChild.waitForExit()) << apWhat << ": " << readFile(mDirectory.path("child.err"));
    }
    void driveToTheEnd(const char* apWhat, const std::function<void()>& acrDo) { drive(1, apWhat, acrDo); }
    void drivePast(const char* apWhat, const std::function<void()>& acrDo) { drive(0, apWhat, acrDo); }

    void driveAll();
    void driveStart();
    void driveEvents();
    void driveCommands();
    void driveThreadProcedures();
    void driveFramework();
    void drivePointers();
    void driveStrings();

    ZTCLogTextsSeen seen() const {
        ZTCLogTextsSeen lSeen;
        lSeen.add(ZTCAgentLog(mTextsPath).rawLines());
        return lSeen;
    }

    const std::string mTextsPath = mDirectory.path("texts.log");

private:
    template <typename TDo>
    void driveForgedString(const char* apWhat, TDo aDo) {
        driveToTheEnd(apWhat, [&] {
            ZTCForgedObject<ZTCString> lForged;
            ZTCString lString("text");
            aDo(lForged.get(), lString);
        });
    }
};

void LogTexts::driveAll() {
    driveStart();
    driveEvents();
    driveCommands();
    driveThreadProcedures();
    driveFramework();
    drivePointers();
    driveStrings();
}

void LogTexts::driveStart() {
    drivePast("preInit and the options, with everything logged", [] {
        const ZTCKeptLogCode lKept;
        ZTCTestTavikSystem lSystem;
        lSystem.preInit();
        lSystem.setCmdLineArgDescs();
    });
    driveToTheEnd("init without a system object", [this] {
        setSystemObject(nullptr);
        const ZTCKeptLogCode lKept;
        bringUp();
    });
}

void LogTexts::driveEvents() {
    drivePast("a pending record whose board has lost its list", [this] {
        bringUp(2);
        setLogCode(255);
        mSystem->makePendingRecord(1, 4);
        mSystem->exchangeRecordLists(1);
        mSystem->filePendingRecord();
    });
    drivePast("a report of the library that finds no memory", [this] {
        setenv(gcStatusPageVariable, mDirectory.path("page").c_str(), 1);
        bringUp();
        setLogCode(255);
        failAllocation(1, [this] { mSystem->getKindStates().reportState(0, 1, 1, KPM_STATE_WORKING, ""); });
    });
    drivePast("events that find no memory", [this] {
        collect();
        setLogCode(255);
        static LINKINFO slLink{};
        static ZTCBytes slRscn = bytesOf("61040008 00000001");
        failAllocation(1, [] { ScopeCb_Generic(0, HBA_wwn{}, 2, 1, nullptr, nullptr); });
        failAllocation(1, [] { ScopeCb_KpmTemp(0, 1, 2); });
        failAllocation(1, [] { ScopeCb_KpmLink(0, &slLink); });
        failAllocation(1, [] { ScopeCb_KpmRscn(0, slRscn.data(), 8); });
    });
}

void LogTexts::driveCommands() {
    driveToTheEnd("a protocol handler without a system", [] { ZTCTavikProtocolHandler lHandler(nullptr); });
    using ZTPHandler = void (ZTCTavikProtocolHandler::*)(const ZTCPointer<ZTCBuffer>&, ZTCPointer<ZTCBuffer>&);
    for (const ZTPHandler lpHandler : std::initializer_list<ZTPHandler>{
             &ZTCTavikProtocolHandler::handleStartScopeCommand, &ZTCTavikProtocolHandler::handleGetScopeDataCommand,
             &ZTCTavikProtocolHandler::handleRegisterTargetsCommand,
             &ZTCTavikProtocolHandler::handleSetCollectionPeriodCommand}) {
        driveToTheEnd("a handler with another's code", [&] {
            ZTCTavikProtocolHandler lHandler(mSystem.get());
            ZTCPointer<ZTCBuffer> lResponse;
            (lHandler.*lpHandler)(makeBuffer(bytesOf("ff 00000001")), lResponse);
        });
    }
    drivePast("a kind of the library's own callbacks that there is none of, and an unregister pass", [this] {
        bringUp();
        setLogCode(255);
        mSystem->getEventCatalogue()->insertIntoCatalogue(ZTCPointer<ZTCScopeEvent>(new ZTCScopeEvent(0, 4)));
        startScope();
        mSystem->getFcInitiator(0)->addRegEvent(ZTCPointer<ZTCScopeEvent>(new ZTCScopeEvent(255, 1)), 7);
        mLibrary.mUnregisterStatuses[mLibrary.mHandles.at({0, 1, 1})] = 3;
        mSystem->getProtocolHandler()->handleUnregisterEvents();
    });
}

void LogTexts::driveThreadProcedures() {
    driveToTheEnd("the command thread without an argument", [] { CommandHandlerThreadProcedure(nullptr); });
    driveToTheEnd("the heartbeat thread without an argument", [] { TavikHeartbeatThread(nullptr); });
    const auto lRun = [this](unsigned aComponent, bool aHasSystem, ZTCThreadComponent::ZTThreadProcedure apProcedure) {
        bringUp();
        setLogCode(255);
        ZTCSystemInterface lInterface;
        ZTCSystemInterface* lpSystem = &lInterface;
        if (aHasSystem) {
            lpSystem = mSystem.get();
        }
        ZTSThreadArguments lArguments{mSystem->threadComponents().get(aComponent).get(), lpSystem};
        apProcedure(&lArguments);
    };
    driveToTheEnd("the command thread with another system", [&] { lRun(1, false, CommandHandlerThreadProcedure); });
    driveToTheEnd("the command thread with another component", [&] { lRun(0, true, CommandHandlerThreadProcedure); });
    drivePast("the heartbeat thread with another component", [&] { lRun(1, true, TavikHeartbeatThread); });
    drivePast("a command thread that is told to quit alone", [&] {
        mSystem->mWaitForActivity = [](unsigned, unsigned) { throw ZTCQuitThreadEx("enough", 1); };
        lRun(1, true, CommandHandlerThreadProcedure);
    });
}

void LogTexts::driveFramework() {
    driveToTheEnd("a reader that there is none of", [this] { mSystem->getReader(0); });
    driveToTheEnd("a writer that there is none of", [this] { mSystem->getWriter(0); });
    drivePast("threads that exceptions leave", [] {
        using ZTCProcedure = std::function<void()>;
        for (const ZTCProcedure& lcrProcedure :
             {ZTCProcedure([] { throw ZTCInvalidEx("ours"); }),
              ZTCProcedure([] { throw std::runtime_error("foreign"); }), ZTCProcedure([] { throw 1; })}) {
            ZTCTestSystem lSystem;
            lSystem.addComponent(new ZTCFunctionComponent(
                lSystem, "thread", [lcrProcedure](ZTCFunctionComponent&, ZTCSystem&) { lcrProcedure(); }));
            lSystem.createThreads();
            lSystem.startThreads();
            lSystem.waitForThreads();
        }
    });
    drivePast("threads that cannot be started", [] {
        ZTCFailingSystem lSystem;
        lSystem.mFailsToStartThreads = true;
        lSystem.addComponent(new ZTCFunctionComponent(lSystem, "thread", [](ZTCFunctionComponent&, ZTCSystem&) {}));
        lSystem.createThreads();
        EXPECT_THROW(lSystem.startThreads(), ZTCOsThreadEx);
    });
    drivePast("a run that fails and cannot be given up in order", [this] {
        ZTCFailingSystem lSystem(mDirectory.path("other.pid"));
        setSystemObject(&lSystem);
        char lProgram[] = "program";
        char lDaemon[] = "-D";
        char lFalse[] = "false";
        char* lArguments[] = {lProgram, lDaemon, lFalse, nullptr};
        EXPECT_THROW(SystemMain(3, lArguments), ZTCInvalidEx);
    });
    drivePast("a wait for signals that fails", [] {
        const ZTCBrokenPoll lBroken;
        ZTCSignalWaiter lWaiter;
        lWaiter.start();
        if (!getStopEvent().waitFor(ZTCDeadline().remainingMilliseconds())) {
            throw std::runtime_error("no stop");
        }
        lWaiter.stop();
    });
    drivePast("objects that cannot be destroyed", [] {
        {
            ZTCMutex lMutex;
            OsDestroyMutex(lMutex.getOsMutex());
        }
        { ZTCConditionalDestroyedBefore lConditional; }
        const ZTCBrokenConditionalDestruction lBroken;
        { ZTCSynchList lList; }
    });
}

void LogTexts::drivePointers() {
    static int sObject = 5;
    const std::pair<const char*, std::function<void(ZTCIntPointer&)>> lUses[] = {
        {"copy", [](ZTCIntPointer& arForged) { ZTCIntPointer lCopy(arForged); }},
        {"assignment",
         [](ZTCIntPointer& arForged) {
             ZTCIntPointer lPointer;
             lPointer = arForged;
         }},
        {"->", [](ZTCIntPointer& arForged) { static_cast<void>(arForged.operator->()); }},
        {"*", [](ZTCIntPointer& arForged) { static_cast<void>(*arForged); }},
        {"get", [](ZTCIntPointer& arForged) { static_cast<void>(arForged.get()); }},
    };
    for (const auto& lcrNamedUse : lUses) {
        const auto& lcrUse = lcrNamedUse.second;
        for (const void* lpObject : {static_cast<const void*>(nullptr), static_cast<const void*>(&sObject)}) {
            driveToTheEnd(lcrNamedUse.first, [&] {
                ZTCForgedObject<ZTCIntPointer> lForged(lpObject);
                lcrUse(lForged.get());
            });
        }
    }
    driveToTheEnd("an array as an object", [] {
        const ZTCIntPointer lArray(new int[2](), ZTPST_Array);
        static_cast<void>(lArray.operator->());
    });
    driveToTheEnd("an array as one of a base", [] {
        const ZTCPointer<ZTSDerived> lArray(new ZTSDerived[2], ZTPST_Array);
        const ZTCPointer<ZTSBase> lBase(lArray);
    });
    driveToTheEnd("an object of no size", [] {
        const ZTCIntPointer lPointer(&sObject, ZTPST_None, ZTPAT_Malloc);
        static_cast<void>(*lPointer);
    });
    driveToTheEnd("the release of no allocation", [] { const ZTCIntPointer lPointer(&sObject, ZTPST_None); });
}

void LogTexts::driveStrings() {
    driveForgedString("copy", [](ZTCString& arForged, ZTCString&) { ZTCString lCopy(arForged); });
    driveForgedString("assignment", [](ZTCString& arForged, ZTCString& arString) { arString = arForged; });
    driveForgedString("get", [](ZTCString& arForged, ZTCString&) { static_cast<void>(arForged.get()); });
    driveForgedString("length", [](ZTCString& arForged, ZTCString&) { static_cast<void>(arForged.length()); });
    driveForgedString("== left",
                      [](ZTCString& arForged, ZTCString& arString) { static_cast<void>(arForged == arString); });
    driveForgedString("== right",
                      [](ZTCString& arForged, ZTCString& arString) { static_cast<void>(arString == arForged); });
    driveForgedString("<", [](ZTCString& arForged, ZTCString& arString) { static_cast<void>(arForged < arString); });
    driveForgedString("+ left",
                      [](ZTCString& arForged, ZTCString& arString) { static_cast<void>(arForged + arString); });
    driveForgedString("+ right",
                      [](ZTCString& arForged, ZTCString& arString) { static_cast<void>(arString + arForged); });
}

}  // namespace

TEST_F(LogTexts, EveryTextThatNoPathOfTheAgentLeadsToIsFoundInARealLog) {
    driveAll();
    EXPECT_EQ(std::vector<std::string>{}, seen().unseen(ZTELogTextPath::Process));
    EXPECT_EQ(std::set<std::string>{}, seen().strangers());
}

TEST_F(LogTexts, WithALogCodeOfZeroAllOfItEndsAlikeAndNothingIsWritten) {
    setLogCode(0);
    const ZTCKeptLogCode lKept;
    driveAll();
    EXPECT_EQ("", readFile(mTextsPath));
}
