#include "system/include/System.h"

#include <fcntl.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <cerrno>
#include <exception>

#include "common/include/Exception.h"
#include "os/common/include/Clib.h"
#include "os/common/include/ProcessEvents.h"
#include "system/include/SystemGlobals.h"

namespace {

bool sIsGivenOut(const ZTCList<unsigned>& acrIds, unsigned aId) {
    for (const unsigned lId : acrIds) {
        if (lId == aId) {
            return true;
        }
    }
    return false;
}

struct utsname sSystemName() {
    struct utsname lName {};
    ::uname(&lName);
    return lName;
}

/// Calls the function; false, with a line at halt level, where an exception came out of it.
template <typename Function>
bool sRunGuarded(const ZTCString& acrThreadName, Function aFunction) noexcept {
    try {
        aFunction();
        return true;
    } catch (const ZTCException& acrException) {
        ZT_LOG_HALT("Thread '%s' ends with an exception: %s (code %u)", acrThreadName.get(), acrException.what(),
                    acrException.getError());
    } catch (const std::exception& acrException) {
        ZT_LOG_HALT("Thread '%s' ends with a foreign exception: %s", acrThreadName.get(), acrException.what());
    } catch (...) {
        ZT_LOG_HALT("Thread '%s' ends with an unknown exception", acrThreadName.get());
    }
    return false;
}

}  // namespace

ZTCSystem::~ZTCSystem() = default;

// ---- Numbers, waking and identity ----

void ZTCSystem::generateNumericId(unsigned& arId) {
    ZTCMutexLock lLock(*mNumericIdsLock);
    unsigned lId = 1;
    while (sIsGivenOut(mNumericIds, lId)) {
        ++lId;
    }
    mNumericIds.push_back(lId);
    arId = lId;
}

void ZTCSystem::returnNumericId(const unsigned& acrId) {
    ZTCMutexLock lLock(*mNumericIdsLock);
    if (!sIsGivenOut(mNumericIds, acrId)) {
        throw ZTCNotFoundEx("The number is not given out");
    }
    ZTCList<unsigned> lRest;
    for (const unsigned lId : mNumericIds) {
        if (lId != acrId) {
            lRest.push_back(lId);
        }
    }
    mNumericIds = lRest;
}

void ZTCSystem::signal(unsigned aConditional) {
    mConditionals.get(aConditional)->signal();
}

ZTCString ZTCSystem::getOs() {
    return ZTCString(sSystemName().sysname);
}

ZTCString ZTCSystem::getOsVariant() {
    return ZTCString(sSystemName().release);
}

// ---- The life of the process ----

void ZTCSystem::preInit() {}

void ZTCSystem::init() {
    mProtocolHelper = ZTCPointer<ZTCProtocolHelper>(NEW ZTCProtocolHelper());
    mBufferManager = ZTCPointer<ZTCBufferManager>(NEW ZTCBufferManager());
    mNumericIdsLock = ZTCPointer<ZTCMutex>(NEW ZTCMutex());
}

void ZTCSystem::postDestroy() {}

void ZTCSystem::destroy() {}

void ZTCSystem::processCommandLine(int aArgc, char** apArgv) {
    mCommandLineParser = ZTCPointer<ZTCCommandLineParser>(NEW ZTCCommandLineParser());
    try {
        mCommandLineParser->parse(mCmdLineArgDescs, aArgc, apArgv);
    } catch (const ZTCInvalidEx& acrException) {
        std::cerr << acrException.what() << std::endl;
        ZT_LOG_ERR("%s", acrException.what());
        throw;
    }
}

void ZTCSystem::setCmdLineArgDescs() {}

void ZTCSystem::processConfigFile(const ZTCString& /*acrPath*/) {
    throw ZTCNotImplementedEx("Not Implemented", gcErrNotImplemented);
}

void ZTCSystem::displayHelp() {}

void ZTCSystem::processCommandLineArguments() {
    const ZTSCommandLineOptions& lcrOptions = mCommandLineParser->getOptions();
    if (lcrOptions.mShowHelp) {
        displayHelpAndExit();
    }
    if (lcrOptions.mShowVersion) {
        displayVersionAndExit();
    }
    if (lcrOptions.mHasLogFile) {
        mLogFilePath = lcrOptions.mLogFile;
        setLogFilePath(mLogFilePath.get());
    }
    if (lcrOptions.mHasLogCode) {
        setLogCode(lcrOptions.mLogCode);
    }
    if (lcrOptions.mHasConfigFile) {
        processConfigFile(lcrOptions.mConfigFile);
    }
    if (lcrOptions.mShutDownOther) {
        try {
            killRunningInstance();
        } catch (const ZTCException& acrException) {
            std::cout << "The running instance cannot be stopped: " << acrException.what() << std::endl;
            ZT_LOG_ERR("The running instance cannot be stopped: %s", acrException.what());
        }
        std::exit(0);
    }
    if (lcrOptions.mHasHbTimeout) {
        setHbTimeout(lcrOptions.mHbTimeout);
    }
    ZTCProtocolHelper::setSnifferMode(lcrOptions.mSniffer);
}

void ZTCSystem::systemDaemonize(ZTCString aDirectory, ZTCString aInput, ZTCString aOutput, ZTCString aError) {
    std::cout.flush();
    std::cerr.flush();
    const ::pid_t lDaemon = ClibFork();
    if (lDaemon != 0) {
        ZTCSignalWaiter::handOnSignals(lDaemon);
        ::_exit(0);
    }
    ClibSetsid();
    if (*aDirectory.get() != '\0') {
        ClibChdir(aDirectory.get());
    }
    ClibRedirect(STDIN_FILENO, aInput.get(), O_RDONLY);
    ClibRedirect(STDOUT_FILENO, aOutput.get(), O_WRONLY);
    ClibRedirect(STDERR_FILENO, aError.get(), O_WRONLY);
}

void ZTCSystem::startSignalWaiter() {
    mSignalWaiter = ZTCPointer<ZTCSignalWaiter>(NEW ZTCSignalWaiter());
    mSignalWaiter->start();
}

void ZTCSystem::stopSignalWaiter() {
    if (mSignalWaiter != nullptr) {
        mSignalWaiter->stop();
    }
}

// ---- Threads ----

void ZTCSystem::createThreads() {
    mThreadTable = ZTCPointer<ZTCThreadTable>(NEW ZTCThreadTable());
    for (unsigned lIndex = 0; lIndex < mThreadComponents.numberOfElements(); ++lIndex) {
        mThreadTable->add(mThreadComponents.get(lIndex).get(), this);
    }
}

void ZTCSystem::startThreads() {
    try {
        for (unsigned lIndex = 0; lIndex < mThreadComponents.numberOfElements(); ++lIndex) {
            startThread(lIndex);
        }
    } catch (const ZTCException& acrException) {
        ZT_LOG_HALT("Starting the threads failed: %s; those that run are stopped", acrException.what());
        destroyThreads();
        throw;
    }
}

void ZTCSystem::startThread(unsigned aThreadComponent) {
    mThreadTable->start(aThreadComponent, &ZTCSystem::runThread);
}

void* ZTCSystem::runThread(void* apArguments) {
    const ZTSThreadArguments& lcrArguments = *static_cast<ZTSThreadArguments*>(apArguments);
    ZTCThreadComponent& lrComponent = *lcrArguments.mpThreadComponent;
    ZTCSystem& lrSystem = *static_cast<ZTCSystem*>(lcrArguments.mpSystemInterface);
    const ZTCString& lcrName = lrComponent.getName();

    const bool lIsProcedureFine = sRunGuarded(lcrName, [&] { lrComponent.getProcedure()(apArguments); });
    const bool lIsFinishFine = sRunGuarded(lcrName, [&] { lrComponent.finish(); });
    if (!lIsProcedureFine || !lIsFinishFine) {
        sRunGuarded(lcrName, [&] { lrSystem.makeThreadsToExit(); });
    }
    lrSystem.mThreadTable->noteEnd();
    return nullptr;
}

void ZTCSystem::waitForThreads() {
    if (!(mThreadTable != nullptr)) {
        return;
    }
    bool lIsTold = false;
    while (!mThreadTable->haveAllEnded()) {
        // poll ignores a negative descriptor.
        struct pollfd lDescriptors[2] = {{mThreadTable->getEndEvent().getDescriptor(), POLLIN, 0},
                                         {lIsTold ? -1 : getStopEvent().getDescriptor(), POLLIN, 0}};
        if (ClibPoll(lDescriptors, 2, -1) == -EINTR) {
            continue;
        }
        if (lDescriptors[0].revents != 0) {
            mThreadTable->getEndEvent().reset();
        }
        if (lDescriptors[1].revents != 0) {
            makeThreadsToExit();
            lIsTold = true;
        }
    }
    mThreadTable->joinAll();
}

void ZTCSystem::makeThreadsToExit() {
    setForExit();
    for (unsigned lIndex = 0; lIndex < mThreadComponents.numberOfElements(); ++lIndex) {
        mThreadComponents.get(lIndex)->setForExit();
    }
    getExitEvent().raise();
    for (unsigned lIndex = 0; lIndex < mConditionals.numberOfElements(); ++lIndex) {
        mConditionals.get(lIndex)->interrupt();
    }
    for (unsigned lIndex = 0; lIndex < mQueues.numberOfElements(); ++lIndex) {
        mQueues.get(lIndex)->interrupt();
    }
    for (unsigned lIndex = 0; lIndex < mLists.numberOfElements(); ++lIndex) {
        mLists.get(lIndex)->interrupt();
    }
}

bool ZTCSystem::isInited(unsigned aThreadComponent) const {
    return mThreadTable != nullptr && mThreadTable->isStarted(aThreadComponent);
}

void ZTCSystem::destroyThreads() {
    if (!(mThreadTable != nullptr)) {
        return;
    }
    if (!mThreadTable->haveAllEnded()) {
        makeThreadsToExit();
    }
    mThreadTable->joinAll();
}

// ---- Waiting and messages, by slot ----

void ZTCSystem::wait(unsigned aConditional) {
    mConditionals.get(aConditional)->wait();
}

void ZTCSystem::timedWait(unsigned aConditional, unsigned aSeconds) {
    mConditionals.get(aConditional)->timedWait(aSeconds);
}

void ZTCSystem::send(unsigned aWriter, const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) {
    getWriter(aWriter)->write(acrBuffer, arCount);
}

void ZTCSystem::receive(unsigned aReader, ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) {
    getReader(aReader)->read(arBuffer, arCount);
}

void ZTCSystem::waitForActivity(unsigned aReader, unsigned aSeconds) {
    getReader(aReader)->waitForActivity(aSeconds);
}

void ZTCSystem::waitOnEmptyQueue(unsigned aQueue, unsigned aSeconds) {
    mQueues.get(aQueue)->waitWhileEmpty(aSeconds);
}

void ZTCSystem::enqueue(unsigned aQueue, const ZTCPointer<ZTCQueueable>& acrItem) {
    mQueues.get(aQueue)->pushBack(acrItem);
}

ZTCPointer<ZTCQueueable> ZTCSystem::dequeue(unsigned aQueue) {
    return mQueues.get(aQueue)->popFront();
}

ZTCPointer<ZTCQueueable> ZTCSystem::queueFront(unsigned aQueue) {
    return mQueues.get(aQueue)->front();
}

void ZTCSystem::queueClear(unsigned aQueue) {
    mQueues.get(aQueue)->clear();
}

bool ZTCSystem::isQueueEmpty(unsigned aQueue) {
    return mQueues.get(aQueue)->isEmpty();
}

void ZTCSystem::waitOnEmptyList(unsigned aList, unsigned aSeconds) {
    mLists.get(aList)->waitWhileEmpty(aSeconds);
}

void ZTCSystem::enlist(unsigned aList, const ZTCPointer<ZTCQueueable>& acrItem) {
    mLists.get(aList)->pushBack(acrItem);
}

void ZTCSystem::enlistFront(unsigned aList, const ZTCPointer<ZTCQueueable>& acrItem) {
    mLists.get(aList)->pushFront(acrItem);
}

ZTCPointer<ZTCQueueable> ZTCSystem::delist(unsigned aList) {
    return mLists.get(aList)->popFront();
}

ZTCPointer<ZTCQueueable> ZTCSystem::delistBack(unsigned aList) {
    return mLists.get(aList)->popBack();
}

ZTCPointer<ZTCQueueable> ZTCSystem::listFront(unsigned aList) {
    return mLists.get(aList)->front();
}

void ZTCSystem::listClear(unsigned aList) {
    mLists.get(aList)->clear();
}

unsigned ZTCSystem::listSize(unsigned aList) {
    return mLists.get(aList)->size();
}

bool ZTCSystem::isListEmpty(unsigned aList) {
    return mLists.get(aList)->isEmpty();
}

void ZTCSystem::listErase(unsigned aList, ZTCSynchList::ZTIterator& arIterator) {
    mLists.get(aList)->erase(arIterator);
}

ZTCSynchList::ZTConstIterator ZTCSystem::listBegin(unsigned aList) const {
    const ZTCSynchList& lcrList = *mLists.get(aList);
    return lcrList.begin();
}

ZTCSynchList::ZTConstIterator ZTCSystem::listEnd(unsigned aList) const {
    const ZTCSynchList& lcrList = *mLists.get(aList);
    return lcrList.end();
}

ZTCSynchList::ZTIterator ZTCSystem::listBegin(unsigned aList) {
    return mLists.get(aList)->begin();
}

ZTCSynchList::ZTIterator ZTCSystem::listEnd(unsigned aList) {
    return mLists.get(aList)->end();
}

// ---- The rest ----

void ZTCSystem::applySettings() {
    throw ZTCNotImplementedEx("Not Implemented", gcErrNotImplemented);
}
