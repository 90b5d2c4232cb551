/// The base of a process's one system object.
///
/// A system owns what the process shares: its thread components, conditionals, queues, lists, readers and writers, each
/// in a vector of slots whose index is the order of appending. The driver (SystemMain) calls its operations in a fixed
/// order; the agent overrides those of them that make and destroy its own objects.
///
/// The slots are filled on the main thread before the threads start and only read afterwards, so they are not locked.
/// What is in them may be used by any thread as its own header says. An index that is not below the number of readers
/// or writers is a broken invariant and ends the process; in another vector it is a ZTCInvalidEx.

#ifndef SYSTEM_INCLUDE_SYSTEM_H
#define SYSTEM_INCLUDE_SYSTEM_H

#include <cstdlib>
#include <iostream>

#include "common/include/Assert.h"
#include "common/include/Buffer.h"
#include "common/include/List.h"
#include "common/include/Log.h"
#include "common/include/Map.h"
#include "common/include/Memory.h"
#include "common/include/Pointer.h"
#include "common/include/String.h"
#include "common/include/ThreadAnnotations.h"
#include "common/include/Vector.h"
#include "os/common/include/Conditional.h"
#include "os/common/include/Mutex.h"
#include "os/common/include/Reader.h"
#include "os/common/include/SystemInterface.h"
#include "os/common/include/ThreadComponent.h"
#include "os/common/include/Writer.h"
#include "system/include/BufferManager.h"
#include "system/include/CommandLineArgumentDesc.h"
#include "system/include/CommandLineParser.h"
#include "system/include/IpAddress.h"
#include "system/include/MultiType.h"
#include "system/include/ProcessInstanceManager.h"
#include "system/include/ProtocolHelper.h"
#include "system/include/Queueable.h"
#include "system/include/SignalWaiter.h"
#include "system/include/SynchList.h"
#include "system/include/ThreadPool.h"
#include "system/include/ThreadTable.h"
#include "system/include/Version.h"

#define MAX_THREAD_COMPONENTS 7
#define MAX_THREADPOOLS 1
#define MAX_CONDITIONALS 7
#define MAX_QUEUES 5
#define MAX_LISTS 5
#define MAX_READERS 5
#define MAX_WRITERS 5

class ZTCSystem : public ZTCSystemInterface {
public:
    explicit ZTCSystem(const ZTCString& acrName)
        : mName(acrName),
          mHostName("localhost"),
          mIsSetForExit(false),
          mLogFilePath(""),
          mCmdLineArgDescs(MAX_CMD_ARGUMENTS),
          mThreadComponents(MAX_THREAD_COMPONENTS),
          mThreadPools(MAX_THREADPOOLS),
          mConditionals(MAX_CONDITIONALS),
          mQueues(MAX_QUEUES),
          mLists(MAX_LISTS),
          mReaders(MAX_READERS),
          mWriters(MAX_WRITERS),
          mExitLock(NEW ZTCMutex()) {
        ZT_ENTRY();
        ZT_EXIT();
    }

    ~ZTCSystem() override;

    // ---- Buffers and numbers (any thread, after init) ----

    virtual void getBuffer(unsigned aSize, ZTCPointer<ZTCBuffer>& arBuffer) {
        mBufferManager->getBuffer(aSize, arBuffer);
    }
    virtual void reuseBuffer(ZTCPointer<ZTCBuffer>& arBuffer) { mBufferManager->reuseBuffer(arBuffer); }
    virtual void clearBuffer(ZTCPointer<ZTCBuffer>& arBuffer) { mBufferManager->clearBuffer(arBuffer); }

    /// The lowest number, from 1 on, that is not given out.
    virtual void generateNumericId(unsigned& arId);

    // ---- Waking, identity and exit (any thread, except the setters) ----

    virtual void signal(unsigned aConditional);

    /// Fatal while no address is set.
    virtual ZTCPointer<ZTCIpAddress> getAddress() { return mAddress; }

    virtual bool isSetForExit() const {
        mExitLock->lock();
        const bool lIsSetForExit = mIsSetForExit;
        mExitLock->unlock();
        return lIsSetForExit;
    }

    virtual void setAddress(const ZTCPointer<ZTCIpAddress>& acrAddress) { mAddress = acrAddress; }
    virtual ZTCString getHostName() { return mHostName; }

    virtual void setForExit() {
        mExitLock->lock();
        mIsSetForExit = true;
        mExitLock->unlock();
    }

    /// The operating system's name, and its release.
    virtual ZTCString getOs();
    virtual ZTCString getOsVariant();

    /// The version as a text; fatal while none is set.
    virtual ZTCString getVersion() { return mVersion->getVersion(); }

    virtual ZTCPointer<ZTCReader> getReader(unsigned acReaderNo) {
        ZT_ASSERT(acReaderNo < this->mReaders.numberOfElements());
        return mReaders.get(acReaderNo);
    }

    virtual ZTCPointer<ZTCWriter> getWriter(unsigned acWriterNo) {
        ZT_ASSERT(acWriterNo < this->mWriters.numberOfElements());
        return mWriters.get(acWriterNo);
    }

    /// Fatal before init().
    virtual ZTCPointer<ZTCProtocolHelper> getProtocolHelper() { return mProtocolHelper; }

    // ---- The life of the process (main thread, called by the driver) ----

    /// Does nothing here.
    virtual void preInit();

    /// Makes the protocol helper, the buffer manager and the lock of the numbers.
    virtual void init();

    /// Does nothing here.
    virtual void postDestroy();

    /// Does nothing here.
    virtual void destroy();

    /// Reads and checks the command line by mCmdLineArgDescs; applies nothing. An error is one line on standard error,
    /// the same in the log at error level, and ZTCInvalidEx.
    virtual void processCommandLine(int aArgc, char** apArgv);

    /// Appends the option descriptors to mCmdLineArgDescs. None here.
    virtual void setCmdLineArgDescs();

    /// Reads a configuration file. Throws ZTCNotImplementedEx here.
    virtual void processConfigFile(const ZTCString& acrPath);

    virtual void displayVersionAndExit() {
        std::cout << mName.get() << " v" << mVersion->getVersion().get() << std::endl;
        std::exit(0);
    }

    virtual void displayHelpAndExit() {
        displayHelp();
        std::exit(0);
    }

    /// Writes the help to standard output. Nothing here.
    virtual void displayHelp();

    virtual bool isAnInstanceRunning() { return mInstanceManager->isAnInstanceRunning(); }
    virtual void markAsRunning() { mInstanceManager->markAsRunning(); }
    virtual void killRunningInstance() { mInstanceManager->killRunningInstance(); }
    virtual void exitInstanceManagement() { mInstanceManager->exitInstanceManagement(); }

    /// Any thread. Throws ZTCClibGetProcStatusFailedEx where the process that the pid file names does not run.
    virtual void getProcStatus(ZTCString aPidFilePath) { mInstanceManager->getProcStatus(aPidFilePath); }

    /// Gives a number back (any thread). Throws ZTCNotFoundEx for one that is not given out.
    virtual void returnNumericId(const unsigned& acrId);

    // ---- Threads ----

    /// Prepares one thread for each component (main thread).
    virtual void createThreads();

    /// Starts them all, in the order of the slots (main thread). When one cannot be started, those that run are made to
    /// exit and joined before the exception leaves.
    virtual void startThreads();

    /// Starts the thread of one component (main thread). It runs the procedure, then finish(); it lets nothing escape:
    /// an exception is logged at halt level and makes the threads exit.
    virtual void startThread(unsigned aThreadComponent);

    /// Does nothing here.
    virtual void postThreadsInit() {}

    /// Waits until every thread has ended and joins them; makes them exit when the stop event is raised (main thread).
    virtual void waitForThreads();

    /// Marks the system and every component for exit, raises the exit event, and wakes whatever waits on a conditional,
    /// a queue or a list, for good. Any thread, once the threads run; any number of times.
    virtual void makeThreadsToExit();

    /// Whether the component's thread was started (main thread).
    virtual bool isInited(unsigned aThreadComponent) const;

    // ---- Waiting and messages, by slot (any thread that may use what is in the slot) ----

    /// Returns when the conditional is signalled or the threads are to exit.
    virtual void wait(unsigned aConditional);

    /// The same; throws ZTCTimeOutEx when the seconds pass first.
    virtual void timedWait(unsigned aConditional, unsigned aSeconds);

    virtual void send(unsigned aWriter, const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount);
    virtual void receive(unsigned aReader, ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount);

    /// Returns when the reader has a message or the threads are to exit; throws ZTCTimeOutEx when the seconds pass
    /// first.
    virtual void waitForActivity(unsigned aReader, unsigned aSeconds);

    virtual void waitOnEmptyQueue(unsigned aQueue, unsigned aSeconds);
    virtual void enqueue(unsigned aQueue, const ZTCPointer<ZTCQueueable>& acrItem);
    virtual ZTCPointer<ZTCQueueable> dequeue(unsigned aQueue);
    virtual ZTCPointer<ZTCQueueable> queueFront(unsigned aQueue);
    virtual void queueClear(unsigned aQueue);
    virtual bool isQueueEmpty(unsigned aQueue);

    virtual void waitOnEmptyList(unsigned aList, unsigned aSeconds);
    virtual void enlist(unsigned aList, const ZTCPointer<ZTCQueueable>& acrItem);
    virtual void enlistFront(unsigned aList, const ZTCPointer<ZTCQueueable>& acrItem);
    virtual ZTCPointer<ZTCQueueable> delist(unsigned aList);
    virtual ZTCPointer<ZTCQueueable> delistBack(unsigned aList);
    virtual ZTCPointer<ZTCQueueable> listFront(unsigned aList);
    virtual void listClear(unsigned aList);
    virtual unsigned listSize(unsigned aList);
    virtual bool isListEmpty(unsigned aList);
    virtual void listErase(unsigned aList, ZTCSynchList::ZTIterator& arIterator);
    virtual ZTCSynchList::ZTConstIterator listBegin(unsigned aList) const;
    virtual ZTCSynchList::ZTConstIterator listEnd(unsigned aList) const;
    virtual ZTCSynchList::ZTIterator listBegin(unsigned aList);
    virtual ZTCSynchList::ZTIterator listEnd(unsigned aList);

    // ---- Settings and the rest (main thread) ----

    /// Throws ZTCNotImplementedEx: a setting has no effect of its own.
    virtual void applySettings();

    /// Throws ZTCNotFoundEx for a key that was not added.
    virtual void getSetting(const ZTCString& acrKey, ZTCPointer<ZTCMultiType>& arValue) {
        arValue = mSettings.get(acrKey);
    }

    /// Throws ZTCExistsEx for a key that was added before.
    virtual void addSetting(const ZTCString& acrKey, const ZTCPointer<ZTCMultiType>& acrValue) {
        mSettings.insert(acrKey, acrValue);
    }

    /// Applies what processCommandLine() has read, in this order. -h and -v end the process. -l and -d come before -c,
    /// so that the log has the lines about a refused file. -c hands the file to processConfigFile(). -s stops the
    /// running instance and ends the process. -b, -S and -D come last.
    virtual void processCommandLineArguments();

    virtual void createStartUpEvent() {}
    virtual void createShutDownEvent() {}

    /// Goes on as a new process in its own session, and ends the calling one silently. The working directory becomes
    /// aDirectory unless that is empty; standard input, output and error become the three paths.
    virtual void systemDaemonize(ZTCString aDirectory, ZTCString aInput, ZTCString aOutput, ZTCString aError);

    /// Makes the threads that run exit, and joins them.
    virtual void destroyThreads();

    // ---- Not part of the operations above ----

    /// Start and end the thread that waits for signals (main thread, called by the driver).
    void startSignalWaiter();
    void stopSignalWaiter();

    /// Whether to run as a daemon: yes, unless the command line that was read says no.
    bool isToRunAsDaemon() const {
        return !(mCommandLineParser != nullptr) || mCommandLineParser->getOptions().mRunAsDaemon;
    }

    const ZTCString& getName() const { return mName; }

    /// Fatal while none is set.
    ZTCPointer<ZTCProcessInstanceManager> getInstanceManager() const { return mInstanceManager; }

protected:
    // Set on the main thread before the threads start.
    ZTCString mName;
    ZTCPointer<ZTCProcessInstanceManager> mInstanceManager;
    ZTCPointer<ZTCVersion> mVersion;
    ZTCPointer<ZTCProtocolHelper> mProtocolHelper;
    ZTCString mHostName;

    bool mIsSetForExit ZT_GUARDED_BY(*mExitLock);

    ZTCString mLogFilePath;
    ZTCPointer<ZTCIpAddress> mAddress;
    ZTCPointer<ZTCSignalWaiter> mSignalWaiter;
    ZTCVector<ZTSCommandLineArgumentDesc> mCmdLineArgDescs;
    ZTCPointer<ZTCCommandLineParser> mCommandLineParser;
    ZTCMap<ZTCString, ZTCPointer<ZTCMultiType>> mSettings;
    ZTCPointer<ZTCBufferManager> mBufferManager;
    ZTCPointer<ZTCThreadTable> mThreadTable;

    // The slots.
    ZTCVector<ZTCPointer<ZTCThreadComponent>> mThreadComponents;
    ZTCVector<ZTCPointer<ZTCThreadPool>> mThreadPools;
    ZTCVector<ZTCPointer<ZTCConditional>> mConditionals;
    ZTCVector<ZTCPointer<ZTCSynchQueue>> mQueues;
    ZTCVector<ZTCPointer<ZTCSynchList>> mLists;
    ZTCVector<ZTCPointer<ZTCReader>> mReaders;
    ZTCVector<ZTCPointer<ZTCWriter>> mWriters;

    // Locks, and what they guard.
    ZTCPointer<ZTCMutex> mNumericIdsLock;  ///< empty before init()
    ZTCPointer<ZTCMutex> mExitLock;
    ZTCList<unsigned int> mNumericIds ZT_GUARDED_BY(*mNumericIdsLock);

private:
    static void* runThread(void* apArguments);
};

#endif
