#include "tavik/include/TavikSystem.h"

#include <iostream>

#include "common/include/Assert.h"
#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "os/common/include/Clib.h"
#include "os/common/include/Conditional.h"
#include "os/common/include/NamedPipeReaderServer.h"
#include "os/common/include/NamedPipeWriterServer.h"
#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "system/include/CommandLineArgumentDesc.h"
#include "system/include/ProcessInstanceManager.h"
#include "system/include/SystemGlobals.h"
#include "system/include/Version.h"
#include "tavik/include/SensorDirectory.h"
#include "tavik/include/TavikCommandHandler.h"
#include "tavik/include/TavikHeartbeatHandler.h"
#include "tavik/include/TavikProtocolHandler.h"

const char gcTavikName[] = "qrv-tvk";
char gRtDir[MAX_FILE_PATH] = "";

namespace {

constexpr char scRuntimeDir[] = "/tmp";

// Hexadecimal 0x777 is octal 3567: set-group-id and sticky; owner r-x, group rw-, others rwx. The umask applies.
constexpr int scRuntimeDirMode = 0x777;

void sCreateRtdir() {
    ZT_ENTRY();
    ZT_TRACE_MSG("Trying to create '%s'", gRtDir);
    try {
        ClibMkdir(gRtDir, scRuntimeDirMode);
    } catch (const ZTCExistsEx&) {
        ZT_LOG_WARN("'%s' already exists... continuing", gRtDir);
    }
    ZT_EXIT();
}

void sInitGlobals() {
    ZT_ENTRY();
    ClibStrcpy(gRtDir, scRuntimeDir);
    setLogCode(gcDefaultLogCode);
    setHbTimeout(gcDefaultHbTimeout);
    sCreateRtdir();
    ZT_EXIT();
}

void sWarnOfStatusPage(const ZTCException& acrException) {
    ZT_ENTRY();
    ZT_LOG_WARN("The status page is missing or has no boards, the agent works without its counts: %s",
                acrException.what());
    ZT_EXIT();
}

}  // namespace

ZTCTavikSystem::ZTCTavikSystem(const ZTCString& acrName)
    : ZTCSystem(acrName),
      mMaxScopeEventDataSize(0),
      mMaxTotalEventDataSize(0),
      mPrevScopeDataSet(false),
      mTotalEventDataSize(0),
      mPrevBoardId(0),
      mPrevDataLock(NEW ZTCMutex()),
      mTvkCmdIpcPath(""),
      mTvkOutIpcPath("") {
    ZT_ENTRY();
    ZT_EXIT();
}

void ZTCTavikSystem::preInit() {
    ZT_ENTRY();
    ZT_LOG_INFO("Performing Tavik system initialization");
    sInitGlobals();
    const char* pQrvSensorDir = ClibGetenv(gcSensorDirVariable, nullptr);
    // clang-format off
    ZT_ASSERT(pQrvSensorDir!=NULL);
    // clang-format on
    setInstallDir(ZTCString(pQrvSensorDir));
    setTvkCmdIpcPath(getInstallDir() + ZTCString(gcCommandFifoName));
    setTvkOutIpcPath(getInstallDir() + ZTCString(gcResponseFifoName));
    setPidFilePathStr(getInstallDir() + ZTCString(gcAgentPidFileName));
    ZTCSystem::preInit();
    ZT_LOG_INFO("Creating instance manager");
    mInstanceManager = ZTCPointer<ZTCProcessInstanceManager>(NEW ZTCProcessInstanceManager(getPidFilePathStr()));
    ZT_LOG_INFO("Creating Version...");
    mVersion = ZTCPointer<ZTCVersion>(NEW ZTCVersion(ZT_MAJOR_VERSION, ZT_MINOR_VERSION, ZT_REVISION_NO, ZT_BUILD_NO));
    ZT_EXIT();
}

void ZTCTavikSystem::init() {
    ZT_ENTRY();
    ZT_LOG_INFO("Performing Tavik system data initialization");
    ZTCSystem::init();
    warnOfSharedDirectory(getInstallDir());
    initStatusPage();
    // Adapters come before anything else that leaves a trace in the file system: a host without any ends here.
    initLibkpm();
    initSynchronizationObjects();
    initIpcObjects();
    initTavikHandlers();
    initThreadComponents();
    ZT_EXIT();
}

void ZTCTavikSystem::initStatusPage() {
    ZT_ENTRY();
    const char* lpPage = ClibGetenv(gcStatusPageVariable, nullptr);
    if (lpPage != nullptr && *lpPage != '\0') {
        try {
            mStatusPage.open(lpPage, gcMaxScopeDataSize);
        } catch (const ZTCClibEx& lrException) {
            sWarnOfStatusPage(lrException);
        }
    }
    const char* lpBell = ClibGetenv(gcBellVariable, nullptr);
    if (lpBell != nullptr && *lpBell != '\0') {
        mBell.open(lpBell);
    }
    ZT_EXIT();
}

void ZTCTavikSystem::initSynchronizationObjects() {
    ZT_ENTRY();
    initConditionals();
    ZT_EXIT();
}

void ZTCTavikSystem::initConditionals() {
    ZT_ENTRY();
    ZT_LOG_INFO("Creating HeartbeatHandler Conditional...");
    mConditionals.add(ZTCPointer<ZTCConditional>(NEW ZTCConditional()));
    ZT_LOG_INFO("Creating CommandHandler Conditional...");
    mConditionals.add(ZTCPointer<ZTCConditional>(NEW ZTCConditional()));
    ZT_EXIT();
}

void ZTCTavikSystem::initIpcObjects() {
    ZT_ENTRY();
    initCommandIpc();
    initOutputIpc();
    ZT_EXIT();
}

void ZTCTavikSystem::initCommandIpc() {
    ZT_ENTRY();
    ZT_TRACE_MSG("Creating Tavik Command Reader IPC...");
    ZTCPointer<ZTCNamedPipeReaderServer> lReader(NEW ZTCNamedPipeReaderServer(mTvkCmdIpcPath, ZTNPS_NonBlock));
    lReader->create();
    ZT_TRACE_MSG("Opening Tavik Command Reader IPC...");
    lReader->open();
    mReaders.add(lReader);
    ZT_EXIT();
}

void ZTCTavikSystem::initOutputIpc() {
    ZT_ENTRY();
    ZT_LOG_INFO("Creating Output IPC...");
    ZTCPointer<ZTCNamedPipeWriterServer> lWriter(NEW ZTCNamedPipeWriterServer(mTvkOutIpcPath, ZTNPS_Block));
    lWriter->create();
    ZT_TRACE_MSG("Opening Response Pipe Writer Server...");
    lWriter->open();
    mWriters.add(lWriter);
    ZT_EXIT();
}

void ZTCTavikSystem::initTavikHandlers() {
    ZT_ENTRY();
    ZT_TRACE_MSG("Creating Tavik Protocol Handler...");
    mProtocolHandler = ZTCPointer<ZTCTavikProtocolHandler>(NEW ZTCTavikProtocolHandler(this));
    ZT_TRACE_MSG("Creating Scope Event Catalogue...");
    mEventCatalogue = ZTCPointer<ZTCTavikEventCatalogue>(NEW ZTCTavikEventCatalogue());
    ZT_EXIT();
}

void ZTCTavikSystem::initThreadComponents() {
    ZT_ENTRY();
    ZTCSystem* lpSystem = getSystemObject();
    ZT_ASSERT(lpSystem != __null);
    initHeartbeatHandler(lpSystem);
    initCommandHandler(lpSystem);
    ZT_EXIT();
}

void ZTCTavikSystem::initHeartbeatHandler(ZTCSystemInterface* apSystemInterface) {
    ZT_ENTRY();
    unsigned int lTimeout = 0;
    getHbTimeout(lTimeout);
    ZT_LOG_NOTICE("Creating the Heartbeat Handler Thread object...Timeout = %u", lTimeout);
    mThreadComponents.add(
        ZTCPointer<ZTCTavikHeartbeatHandler>(NEW ZTCTavikHeartbeatHandler(apSystemInterface, lTimeout)));
    ZT_EXIT();
}

void ZTCTavikSystem::initCommandHandler(ZTCSystemInterface* apSystemInterface) {
    ZT_ENTRY();
    ZT_LOG_INFO("Creating Command Handler Thread object...");
    mThreadComponents.add(
        ZTCPointer<ZTCTavikCommandHandler>(NEW ZTCTavikCommandHandler(apSystemInterface, gcCommandWaitTime)));
    ZT_EXIT();
}

void ZTCTavikSystem::waitForThreads() {
    ZT_ENTRY();
    ZTCSystem::waitForThreads();
    // Threads that ended for a reason of their own have noted it before.
    mStatusPage.setEnd(ZTSE_Other);
    ZT_EXIT();
}

void ZTCTavikSystem::destroy() {
    ZT_ENTRY();
    destroyIpcObjects();
    ZT_TRACE_MSG("Performing common system data destruction");
    ZTCSystem::destroy();
    ZT_EXIT();
}

void ZTCTavikSystem::destroyIpcObjects() {
    ZT_ENTRY();
    destroyCommandIpc();
    destroyOutputIpc();
    ZT_EXIT();
}

void ZTCTavikSystem::destroyCommandIpc() {
    ZT_ENTRY();
    ZT_LOG_INFO("Closing and Destroying Command Pipe...");
    if (auto* lpServer = dynamic_cast<ZTCNamedPipeReaderServer*>(getReader(0).get())) {
        lpServer->close();
        lpServer->destroy();
    }
    ZT_EXIT();
}

void ZTCTavikSystem::destroyOutputIpc() {
    ZT_ENTRY();
    ZT_LOG_INFO("Closing and Destroying Output Pipe...");
    if (auto* lpServer = dynamic_cast<ZTCNamedPipeWriterServer*>(getWriter(0).get())) {
        lpServer->close();
        lpServer->destroy();
    }
    ZT_EXIT();
}

void ZTCTavikSystem::postDestroy() {
    ZT_ENTRY();
    ZT_TRACE_MSG("Performing common system destruction");
    ZTCSystem::postDestroy();
    ZT_EXIT();
}

// ---- Command line ----

void ZTCTavikSystem::setCmdLineArgDescs() {
    ZT_ENTRY();
    static constexpr struct {
        ZTECommandLineArgumentType mType;
        const char* mpIdentifier;
    } lcOptions[] = {
        {ZTCLAT_OptionOnly, "-h"},  {ZTCLAT_OptionOnly, "-v"},  {ZTCLAT_OptionOnly, "-s"},
        {ZTCLAT_OptionValue, "-D"}, {ZTCLAT_OptionValue, "-l"}, {ZTCLAT_OptionValue, "-d"},
        {ZTCLAT_OptionValue, "-c"}, {ZTCLAT_OptionOnly, "-S"},  {ZTCLAT_OptionValue, "-b"},
    };
    ZT_LOG_INFO("Setting Command line argument descs");
    for (const auto& lrOption : lcOptions) {
        ZTSCommandLineArgumentDesc lDesc{};
        lDesc.type = lrOption.mType;
        ClibStrcpy(lDesc.identifier, lrOption.mpIdentifier);
        mCmdLineArgDescs.add(lDesc);
    }
    ZT_EXIT();
}

void ZTCTavikSystem::processConfigFile(const ZTCString&) {
    ZT_ENTRY();
    ZT_THROW(ZTCNotImplementedEx, "Not Implemented", 13);
}

void ZTCTavikSystem::displayHelp() {
    ZT_ENTRY();
    unsigned int lLogCode = 0;
    getLogCode(lLogCode);
    unsigned int lTimeout = 0;
    getHbTimeout(lTimeout);
    std::cout << mName.get() << " -[hvsDldc] VALUE" << std::endl;
    std::cout << "  -h             : Shows this help" << std::endl;
    std::cout << "  -v             : Prints version" << std::endl;
    std::cout << "  -s             : Shut down running Tavik" << std::endl;
    std::cout << "  -D true|false  : Run as daemon (default: true)" << std::endl;
    std::cout << "  -d {number}    : Debug level - OR of numbers from 0-7 (default: " << lLogCode << ")" << std::endl;
    std::cout << "  -c {filename}  : Specify config file (default: " << getConfFilePathStr().get() << ")" << std::endl;
    std::cout << "  -S             : Run Tavik in Sniffer Mode" << std::endl;
    std::cout << "  -b {number}    : Heartbeat Timeout (default: " << lTimeout << ")" << std::endl;
    ZT_EXIT();
}

// ---- Adapters and targets ----

void ZTCTavikSystem::initLibkpm() {
    ZT_ENTRY();
    mLibkpmAbs = ZTCPointer<ZTCLibkpmAbs>(NEW ZTCLibkpmAbs());
    try {
        mLibkpmAbs->LIBKPM_LoadLibrary(&mKindStates);
    } catch (const ZTCNotFoundEx&) {
        mStatusPage.setEnd(ZTSE_NoLibrary);
        ZT_LOG_NOTICE("No Libkpm Found or Disabled.. Tavik would exit");
        ZT_THROW(ZTCExitConditionEx, "No Libkpm found", 19);
    }
    mLibkpmAbs->LIBKPM_Init();
    const unsigned int lNumberOfAdapters = mLibkpmAbs->LIBKPM_GetNumberOfAdapters();
    if (lNumberOfAdapters == 0) {
        closeLibkpm();
        mStatusPage.setEnd(ZTSE_NoAdapters);
        ZT_LOG_NOTICE("No QRV Adapters found.. Tavik would exit");
        ZT_THROW(ZTCExitConditionEx, "No QRV Adapters found.. Tavik would exit", 19);
    }
    if (!mLibkpmAbs->LIBKPM_IsZtapiSupported()) {
        closeLibkpm();
        mStatusPage.setEnd(ZTSE_NoEventSupport);
        ZT_LOG_NOTICE("Old incompatible driver found.. Tavik would exit");
        ZT_THROW(ZTCExitConditionEx, "Old incompatible driver found.. Tavik would exit", 19);
    }
    for (unsigned int lIndex = 0; lIndex < lNumberOfAdapters; ++lIndex) {
        ZTCPointer<ZTCWorldWideName> lWwnn;
        ZTCPointer<ZTCWorldWideName> lWwpn;
        mLibkpmAbs->LIBKPM_GetAdapterInfo(lIndex, lWwnn, lWwpn);
        ZT_LOG_NOTICE("Discovered QRV initiator <%s, %s>", lWwnn->getString().get(), lWwpn->getString().get());
        ZTCPointer<ZTCTavikInitiator> lInitiator(NEW ZTCTavikInitiator(lIndex, lWwnn, lWwpn));
        ZTCPointer<ZTCTavikRecordList> lRecordList(NEW ZTCTavikRecordList(lIndex, this));
        mInitiatorsMap.insert(lIndex, lInitiator);
        const ZTCPrevDataHold lHold(*this);
        mRecordsMap.insert(lIndex, lRecordList);
    }
    try {
        mKindStates.addBoards(mInitiatorsMap);
    } catch (const ZTCClibEx& lrException) {
        sWarnOfStatusPage(lrException);
    }
    ZT_EXIT();
}

void ZTCTavikSystem::showAdapters() {
    ZT_ENTRY();
    if (mStatusPage.isOpen()) {
        mStatusPage.setAdapters(mLibkpmAbs->LIBKPM_GetNumberOfAdapters());
    }
    ZT_EXIT();
}

void ZTCTavikSystem::closeLibkpm() {
    ZT_ENTRY();
    mLibkpmAbs->LIBKPM_Close();
    mLibkpmAbs->LIBKPM_FreeLibrary();
    ZT_EXIT();
}

void ZTCTavikSystem::addFcTarget(const ZTCPointer<ZTCTavikTarget>& acrTarget) {
    ZT_ENTRY();
    bool lIsNew;
    {
        const ZTCPrevDataHold lHold(*this);
        lIsNew = !mTargetsMap.hasKey(acrTarget->getFcId());
        if (lIsNew) {
            mTargetsMap.insert(acrTarget->getFcId(), acrTarget);
        }
    }
    if (lIsNew) {
        ZT_LOG_NOTICE("Registered Target <%s, %s, %u>", acrTarget->getWwnn()->getString().get(),
                      acrTarget->getWwpn()->getString().get(), acrTarget->getFcId());
    }
    ZT_EXIT();
}

void ZTCTavikSystem::addWwpnTarget(const ZTCPointer<ZTCTavikTarget>& acrTarget) {
    ZT_ENTRY();
    const unsigned long lKey = acrTarget->getWwpn()->getKey();
    bool lIsNew;
    {
        const ZTCPrevDataHold lHold(*this);
        lIsNew = !mTargetsWwpnMap.hasKey(lKey);
        if (lIsNew) {
            mTargetIndex.reserveOne();
            mTargetsWwpnMap.insert(lKey, acrTarget);
            mTargetIndex.insert({*acrTarget->getWwpn(), *acrTarget->getWwnn()});
        }
    }
    if (lIsNew) {
        ZT_LOG_NOTICE("Added Target <%s, %s, %u> to Wwpn Target Map", acrTarget->getWwnn()->getString().get(),
                      acrTarget->getWwpn()->getString().get(), acrTarget->getFcId());
    }
    ZT_EXIT();
}

const ZTCTavikTarget* ZTCTavikSystem::findFcTarget(unsigned int aFcId) const {
    ZT_ENTRY();
    const ZTCPointer<ZTCTavikTarget>* const lpTarget = mTargetsMap.get(aFcId, std::nothrow);
    ZT_EXIT();
    return lpTarget == nullptr ? nullptr : lpTarget->get();
}

const ZTSRemotePortNames* ZTCTavikSystem::findWwpnNames(unsigned long aKey) noexcept {
    ZT_ENTRY();
    const ZTSRemotePortNames* lpNames = mTargetIndex.find(aKey);
    if (lpNames == nullptr && isLogLevelEnabled(ZTLL_Info)) {
        // The map does not have it either, and says so.
        static_cast<void>(mTargetsWwpnMap.get(aKey, std::nothrow));
    }
    ZT_EXIT();
    return lpNames;
}

// ---- Retrieval and limit ----

void ZTCTavikSystem::noteRetrieval() {
    ZT_ENTRY();
    mStatusPage.countRetrieval();
    mBell.noteRetrieval();
    ZT_EXIT();
}

bool ZTCTavikSystem::isTotalLimitOnScopeDataReached() {
    ZT_ENTRY();
    const unsigned int lTotal = mTotalEventDataSize;
    const bool lIsReached = lTotal >= gcMaxScopeDataSize;
    if (lIsReached) {
        ZT_LOG_NOTICE("Current size = %u", lTotal);
    }
    ZT_EXIT();
    return lIsReached;
}
