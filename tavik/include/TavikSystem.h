/// The agent's one system object: its start and stop, the maps of ports and record lists, and the pending record.
#ifndef TAVIK_INCLUDE_TAVIKSYSTEM_H
#define TAVIK_INCLUDE_TAVIKSYSTEM_H

#include <atomic>
#include <cstdint>

#include "common/include/Map.h"
#include "common/include/Pointer.h"
#include "common/include/String.h"
#include "common/include/ThreadAnnotations.h"
#include "common/include/Types.h"
#include "os/common/include/Mutex.h"
#include "sensor/agentcommon/include/LibkpmAbs.h"
#include "sensor/agentcommon/include/ScopeData.h"
#include "sensor/agentcommon/include/WorldWideName.h"
#include "system/include/System.h"
#include "tavik/include/Bell.h"
#include "tavik/include/KindStates.h"
#include "tavik/include/StatusPageWriter.h"
#include "tavik/include/TavikEventCatalogue.h"
#include "tavik/include/TavikInitiator.h"
#include "tavik/include/TavikRecord.h"
#include "tavik/include/TavikRecordList.h"
#include "tavik/include/TavikTarget.h"
#include "tavik/include/TavikTargetIndex.h"

class ZTCTavikProtocolHandler;

using ZTCTavikInitiatorsMap = ZTCMap<unsigned int, ZTCPointer<ZTCTavikInitiator>>;
using ZTCTavikTargetsMap = ZTCMap<unsigned int, ZTCPointer<ZTCTavikTarget>>;
using ZTCTavikTargetWwpnMap = ZTCMap<unsigned long, ZTCPointer<ZTCTavikTarget>>;
using ZTCTavikRecordsMap = ZTCMap<unsigned int, ZTCPointer<ZTCTavikRecordList>>;

/// The agent's name, shown by the version and the help.
extern const char gcTavikName[];

/// Bytes of the runtime directory's buffer.
inline constexpr unsigned MAX_FILE_PATH = 512;

/// The runtime directory: always "/tmp".
extern char gRtDir[MAX_FILE_PATH];

/// Event-data bytes that may be held before events are refused; tested on admission only, so that one admitted event
/// may carry the total past it.
inline constexpr unsigned int gcMaxScopeDataSize = 262144;

/// Longest wait of the command thread for a command, in seconds.
inline constexpr unsigned int gcCommandWaitTime = 3;

class ZTCTavikSystem : public ZTCSystem {
public:
    explicit ZTCTavikSystem(const ZTCString& acrName);
    ~ZTCTavikSystem() override = default;

    void preInit() override;
    void init() override;
    void postDestroy() override;
    void destroy() override;
    void setCmdLineArgDescs() override;
    void processConfigFile(const ZTCString& acrPath) override;
    void displayHelp() override;
    void waitForThreads() override;

    ZTCString getTvkCmdIpcPath() const { return mTvkCmdIpcPath; }
    void setTvkCmdIpcPath(const ZTCString& acrPath) { mTvkCmdIpcPath = acrPath; }
    ZTCString getTvkOutIpcPath() const { return mTvkOutIpcPath; }
    void setTvkOutIpcPath(const ZTCString& acrPath) { mTvkOutIpcPath = acrPath; }

    // ---- Constant once init has run: read by every thread without a lock.

    ZTCPointer<ZTCLibkpmAbs>& getLibkpmAbs() { return mLibkpmAbs; }
    ZTCPointer<ZTCTavikEventCatalogue>& getEventCatalogue() { return mEventCatalogue; }
    ZTCPointer<ZTCTavikProtocolHandler>& getProtocolHandler() { return mProtocolHandler; }

    bool isFcInitiatorExist(unsigned int aBoardId) const { return mInitiatorsMap.hasKey(aBoardId); }

    /// Throws ZTCNotFoundEx where there is no such board.
    const ZTCPointer<ZTCTavikInitiator>& getFcInitiator(unsigned int aBoardId) const {
        return mInitiatorsMap.get(aBoardId);
    }
    const ZTCTavikInitiatorsMap& getInitiators() const { return mInitiatorsMap; }

    /// Closes and unloads the adapters' library. The caller holds no lock: callbacks are waited for.
    void closeLibkpm();

    // ---- The status page and the bell: made by init, where the environment asks for them.

    ZTCStatusPageWriter& getStatusPage() { return mStatusPage; }
    ZTCKindStates& getKindStates() { return mKindStates; }
    ZTCBell& getBell() { return mBell; }

    /// Shows on the page how many adapters there are now. Only the command thread, between two commands.
    void showAdapters();

    /// Counts on the page that all records are handed over now, and lets the bell ring again.
    void noteRetrieval() ZT_REQUIRES(mPrevDataLock);

    // ---- Targets: changed by the command thread, read by callbacks.

    /// Adds the target under its FC id. The first registration of an FC id wins; a later one does nothing.
    void addFcTarget(const ZTCPointer<ZTCTavikTarget>& acrTarget) ZT_EXCLUDES(mPrevDataLock);

    /// Adds the target under its port name. Here too the first registration wins.
    void addWwpnTarget(const ZTCPointer<ZTCTavikTarget>& acrTarget) ZT_EXCLUDES(mPrevDataLock);

    /// Throw ZTCNotFoundEx where there is no such target. The key of a port name is ZTCWorldWideName::getKey.
    const ZTCPointer<ZTCTavikTarget>& getFcTarget(unsigned int aFcId) const ZT_REQUIRES(mPrevDataLock) {
        return mTargetsMap.get(aFcId);
    }
    const ZTCPointer<ZTCTavikTarget>& getWwpnTarget(const unsigned long& acrKey) const ZT_REQUIRES(mPrevDataLock) {
        return mTargetsWwpnMap.get(acrKey);
    }

    /// For the path of events, where unknown ports are common: null where there is no such target.
    const ZTCTavikTarget* findFcTarget(unsigned int aFcId) const ZT_REQUIRES(mPrevDataLock);
    const ZTSRemotePortNames* findWwpnNames(unsigned long aKey) noexcept ZT_REQUIRES(mPrevDataLock);

    // ---- Record lists: filled by callbacks, exchanged by the command thread.

    bool isRecordListExist(unsigned int aBoardId) ZT_REQUIRES(mPrevDataLock) { return mRecordsMap.hasKey(aBoardId); }

    /// Throws ZTCNotFoundEx where the board has no list.
    ZTCPointer<ZTCTavikRecordList>& getRecordList(unsigned int aBoardId) ZT_REQUIRES(mPrevDataLock) {
        return mRecordsMap.get(aBoardId);
    }

    /// Called by the command thread alone, which is also the only one that changes the map.
    unsigned int getNumRecordLists() const ZT_NO_THREAD_SAFETY_ANALYSIS { return mRecordsMap.size(); }

    /// Makes an empty list for every board that the library has now, and changes nothing else. So what can fail is done
    /// before the lists are exchanged.
    void makeRecordLists(ZTCTavikRecordsMap& arLists);

    /// Empties the records map: its lists go to arTaken, whose own are dropped.
    void clearRecordsMap(ZTCTavikRecordsMap& arTaken) noexcept ZT_REQUIRES(mPrevDataLock);

    /// Puts the lists of makeRecordLists into the (empty) records map and leaves arLists empty.
    void addNewRecordListsToRecordsMap(ZTCTavikRecordsMap& arLists) noexcept ZT_REQUIRES(mPrevDataLock);

    // ---- Limits: atomic, read on admission without a lock.

    /// Per-record limit on event-data bytes. While it is 0 nothing is appended to a record.
    unsigned int getMaxEventDataSize() const { return mMaxScopeEventDataSize; }
    void setMaxEventDataSize(unsigned int aSize) { mMaxScopeEventDataSize = aSize; }

    /// Whether the bytes held have reached gcMaxScopeDataSize; logs them if so.
    bool isTotalLimitOnScopeDataReached();
    unsigned int getTotalEventDataSize() const { return mTotalEventDataSize; }
    void resetTotalEventDataSize() { mTotalEventDataSize = 0; }

    // ---- The pending record: the one that consolidation is still extending, in no list yet.

    /// Names the lock for the thread-safety analysis.
    const ZTCMutex& getPrevDataLock() const ZT_RETURN_CAPABILITY(mPrevDataLock) { return *mPrevDataLock; }
    void acquirePrevDataLock() ZT_ACQUIRE(mPrevDataLock) {
        ZT_ENTRY();
        mPrevDataLock->lock();
        ZT_EXIT();
    }
    void releasePrevDataLock() ZT_RELEASE(mPrevDataLock) {
        ZT_ENTRY();
        mPrevDataLock->unlock();
        ZT_EXIT();
    }

    bool isPrevScopeDataSet() const ZT_REQUIRES(mPrevDataLock) { return mPrevScopeDataSet; }
    ZTCPointer<ZTCScopeData>& getPrevScopeData() ZT_REQUIRES(mPrevDataLock) { return mPrevScopeData; }
    unsigned int getPrevBoardId() const ZT_REQUIRES(mPrevDataLock) { return mPrevBoardId; }

    /// Files the pending record, if there is one, and makes the data a new pending record. Throws ZTCNoMemoryEx; the
    /// old record is then still pending and in no list.
    void setPrevScopeData(unsigned int aBoardId, ZTCPointer<ZTCScopeData>& arData) ZT_REQUIRES(mPrevDataLock);

    /// Files the pending record, if there is one. Throws ZTCNoMemoryEx; it is then still pending.
    void clearPrevScopeData() ZT_REQUIRES(mPrevDataLock);

    /// Whether the pending record stays strictly below the per-record limit with so many bytes more.
    bool canAddEventDataPerRecord(unsigned int aLength) ZT_REQUIRES(mPrevDataLock) {
        ZT_ENTRY();
        const std::uint64_t lWanted = std::uint64_t{mPrevScopeData->getEventDataSize()} + aLength;
        ZT_EXIT();
        return lWanted < mMaxScopeEventDataSize;
    }

    /// Adds bytes and an occurrence to the pending record. Throws ZTCNoMemoryEx and changes nothing then.
    void appendEventData(unsigned char* apData, unsigned int aLength) ZT_REQUIRES(mPrevDataLock);

    /// Adds an occurrence to the pending record.
    void incrementOccurences() ZT_REQUIRES(mPrevDataLock) {
        ZT_ENTRY();
        mPrevScopeRecord->incrementOccurrences();
        if (mpPrevRow != nullptr) {
            countOccurrence();
        }
        ZT_EXIT();
    }

private:
    void initStatusPage();
    void initSynchronizationObjects();
    void initConditionals();
    void initIpcObjects();
    void initCommandIpc();
    void initOutputIpc();
    void initTavikHandlers();
    void initThreadComponents();
    void initHeartbeatHandler(ZTCSystemInterface* apSystemInterface);
    void initCommandHandler(ZTCSystemInterface* apSystemInterface);
    void initLibkpm();
    void destroyIpcObjects();
    void destroyCommandIpc();
    void destroyOutputIpc();
    void filePrevScopeRecord() ZT_REQUIRES(mPrevDataLock);

    /// Counts the latest occurrence of the pending record in its row of the page, which there is.
    void countOccurrence() noexcept ZT_REQUIRES(mPrevDataLock) {
        ZT_ENTRY();
        ZTCStatusPageWriter::countConsolidated(*mpPrevRow, mPrevScopeRecord->getEndTime());
        ZT_EXIT();
    }

    std::atomic<Size> mMaxScopeEventDataSize;
    [[maybe_unused]] Size mMaxTotalEventDataSize;  ///< the admission test uses gcMaxScopeDataSize
    ZTCPointer<ZTCLibkpmAbs> mLibkpmAbs;
    ZTCTavikInitiatorsMap mInitiatorsMap;
    ZTCTavikTargetsMap mTargetsMap ZT_GUARDED_BY(mPrevDataLock);
    ZTCTavikRecordsMap mRecordsMap ZT_GUARDED_BY(mPrevDataLock);
    ZTCPointer<ZTCTavikProtocolHandler> mProtocolHandler;
    ZTCPointer<ZTCTavikEventCatalogue> mEventCatalogue;
    bool mPrevScopeDataSet ZT_GUARDED_BY(mPrevDataLock);
    ZTCPointer<ZTCScopeData> mPrevScopeData ZT_GUARDED_BY(mPrevDataLock);
    ZTCTavikTargetWwpnMap mTargetsWwpnMap ZT_GUARDED_BY(mPrevDataLock);
    ZTCPointer<ZTCWorldWideName> mPrevPortName ZT_GUARDED_BY(mPrevDataLock);
    std::atomic<std::uint32_t> mTotalEventDataSize;  ///< written under mPrevDataLock
    unsigned int mPrevBoardId ZT_GUARDED_BY(mPrevDataLock);
    ZTCPointer<ZTCTavikRecord> mPrevScopeRecord ZT_GUARDED_BY(mPrevDataLock);

    /// Guards the pending record, the record lists, the running total and the target maps. The log's lock is the only
    /// one that is taken while it is held.
    ZTCPointer<ZTCMutex> mPrevDataLock;
    ZTCString mTvkCmdIpcPath;
    ZTCString mTvkOutIpcPath;

    ZTCTavikTargetIndex mTargetIndex ZT_GUARDED_BY(mPrevDataLock);  ///< the names in mTargetsWwpnMap

    // Each has a synchronization of its own, which its header describes.
    ZTCStatusPageWriter mStatusPage;
    ZTCKindStates mKindStates{mStatusPage};
    ZTCBell mBell{gcMaxScopeDataSize};
    ZTSStatusRow* mpPrevRow ZT_GUARDED_BY(mPrevDataLock) = nullptr;  ///< of the pending record; null without a page

    friend class ZTCPrevDataHold;
};

/// Holds the system's previous-data lock for a scope.
class ZT_SCOPED_CAPABILITY ZTCPrevDataHold {
public:
    explicit ZTCPrevDataHold(ZTCTavikSystem& arSystem) ZT_ACQUIRE(arSystem.mPrevDataLock) : mrSystem(arSystem) {
        ZT_ENTRY();
        mrSystem.mPrevDataLock->lock();
        ZT_EXIT();
    }
    ~ZTCPrevDataHold() ZT_RELEASE() {
        ZT_ENTRY();
        mrSystem.mPrevDataLock->unlock();
        ZT_EXIT();
    }
    ZTCPrevDataHold(const ZTCPrevDataHold&) = delete;
    ZTCPrevDataHold& operator=(const ZTCPrevDataHold&) = delete;

private:
    ZTCTavikSystem& mrSystem;
};

#endif
