/// The test's end of the scripted adapters' library (libkpm-scripted.so): a library that does what the test tells it.
///
/// One object serves one agent. Its directory, named to the library by the environment variable ZT_SCRIPTED_KPM_DIR,
/// holds
///   scripted.conf   configuration lines, read when the agent asks for the table of functions
///   scripted.sock   the socket to which the library connects in Init, and over which it is driven
///   scripted.calls  one line per call that the library got, in order; it outlives the agent
///
/// Configuration lines, valid before the start and, through configure(), at any time while the library is open:
///   adapter NODE PORT                    one more adapter, with these names (16 hex digits each)
///   adapters N                           from now on GetNumberOfAdapters says N
///   function-list-status S               KPM_GetFunctionList answers S
///   version V, size S                    the version and size that the table of functions states
///   null-entry N                         entry N of the table (0: Init ... 8: KpmUnregEvent) is null
///   init-status S                        Init answers S
///   ztapi-supported 0|1                  what IsZtapiSupported answers
///   info-status I S                      GetAdapterInfo of adapter I answers S
///   register-status B C U S              ZtapiRegEvent of category C, subcategory U on board B answers S
///   register-handle B C U H              the handle of that registration (category 0: of KpmRegEvent for event type U)
///   deliver-on-register B C U EVENT...   that registration delivers the event on another thread, and returns only when
///                                        its callback has returned (or after 10 s, which the calls tell)
///   deliver-in-register B C U EVENT...   the same, on the very thread that registers
///   deliver-in-close N EVENT...          Close delivers these events on N threads, waits for those, and delivers the
///                                        first one more on its own thread, before it closes anything
///   hold FUNCTION                        the next call of Init, GetNumberOfAdapters, ZtapiRegEvent or Close waits
///                                        until letGo(), and is recorded as "FUNCTION held"
///   hold-nothing                         takes every such line back
///   log L TEXT                           writes a line of level L to the agent's log; only while the library is open
///   state B C U S REASON                 reports state S of the kind that is delivered as category C, subcategory U on
///                                        board B; only while the library is open
///   loss N NAME                          reports that N of these are lost so far; only while the library is open
#ifndef TESTS_SUPPORT_SCRIPTEDLIBRARY_H
#define TESTS_SUPPORT_SCRIPTEDLIBRARY_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/Bytes.h"
#include "tests/support/LibraryEvent.h"

class ZTCScriptedLibrary {
public:
    /// `acrDirectory` exists and is the library's own.
    explicit ZTCScriptedLibrary(const std::string& acrDirectory);
    ~ZTCScriptedLibrary();
    ZTCScriptedLibrary(const ZTCScriptedLibrary&) = delete;
    ZTCScriptedLibrary& operator=(const ZTCScriptedLibrary&) = delete;

    /// The shared object's path.
    static std::string modulePath();
    const std::string& directory() const { return mDirectory; }

    /// Gives the library a configuration line; one that runs has applied it on return.
    void configure(const std::string& acrLine);
    /// Adds an adapter, before the start. Board b of the default names has the node name 20:00:00:00:c9:00:00:0b and
    /// the port name 10:00:00:00:c9:00:00:0b.
    void addAdapter(const ZTSWwn& acrNodeName, const ZTSWwn& acrPortName);
    void addAdapters(unsigned aCount);
    static ZTSWwn nodeName(unsigned aBoard) { return makeWwn(0x20000000c9000000 + aBoard); }
    static ZTSWwn portName(unsigned aBoard) { return makeWwn(0x10000000c9000000 + aBoard); }

    /// Delivers the event on the library's thread number `aThread` and returns when the callback has returned.
    void deliver(const ZTSLibraryEvent& acrEvent, unsigned aThread = 0);
    /// Delivers the events one after another on one thread and returns when the last callback has returned.
    void deliverAll(const std::vector<ZTSLibraryEvent>& acrEvents);

    /// Starts `aThreads` threads, each of which delivers the events over and over, `aRounds` times, or without end
    /// where that is 0. Thread t starts with event t, so that they do not go in step. One storm at a time.
    void startStorm(unsigned aThreads, std::uint64_t aRounds, const std::vector<ZTSLibraryEvent>& acrEvents);
    /// Waits until the storm is over; returns the number of callbacks that have returned.
    std::uint64_t waitForStorm();
    /// Ends a storm early, and waits as above.
    std::uint64_t stopStorm();

    /// Lets the function that is held go on (see "hold").
    void letGo();

    /// Whether an agent that runs has the library open. Forgets agents that have ended: only a few of them may wait to
    /// be forgotten.
    bool isOpen();
    /// Waits until the library has been opened by the agent. Everything that drives the library does so by itself.
    void waitUntilOpen();

    /// The calls the library got so far, one text each.
    std::vector<std::string> calls() const;
    /// Those of them that begin with this.
    std::vector<std::string> callsOf(const std::string& acrPrefix) const;
    void waitForCall(const std::string& acrPrefix) const;

private:
    std::string request(const std::string& acrLine);
    /// Accepts a library's connection if one comes within this time.
    bool takeConnection(int aMilliseconds);

    std::string mDirectory;
    std::string mBuffered;
    int mListener = -1;
    int mConnection = -1;
    unsigned mAdapters = 0;
};

#endif
