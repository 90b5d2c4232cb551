/// The callbacks that the agent has registered with the scripted adapters' library, and the delivery of events to them.
///
/// Everything that a callback is lent is overwritten and freed as soon as the callback has returned.
#ifndef TESTS_SUPPORT_SCRIPTEDCALLBACKS_H
#define TESTS_SUPPORT_SCRIPTEDCALLBACKS_H

#include <map>
#include <mutex>

#include "libkpm/include/libkpm.h"
#include "tests/support/LibraryEvent.h"
#include "tests/support/ScriptedSettings.h"

/// All operations may be called from any thread.
class ZTCScriptedCallbacks {
public:
    void addScope(const ZTCKindKey& acrKind, KPM_ScopeCallback apCallback, void* apContext);
    /// For a kind of category 0.
    void addBoard(const ZTCKindKey& acrKind, KPM_EventCallback apCallback);
    void clear();

    /// Calls the callback of the event's board and kind. An event that nothing was registered for goes to the newest
    /// callback of its type. Throws std::runtime_error where there is none. Holds no lock while it calls.
    void deliver(const ZTSLibraryEvent& acrEvent);

private:
    struct Scope {
        KPM_ScopeCallback mpCallback = nullptr;
        void* mpContext = nullptr;
    };

    Scope findScope(const ZTSLibraryEvent& acrEvent);
    KPM_EventCallback findBoard(const ZTSLibraryEvent& acrEvent);

    std::mutex mLock;

    // Guarded by mLock.
    std::map<ZTCKindKey, Scope> mScopes;
    Scope mNewestScope;
    std::map<ZTCKindKey, KPM_EventCallback> mBoards;
    std::map<unsigned, KPM_EventCallback> mNewestBoards;  // by event type
};

#endif
