/// Messages between the keeper (tavik-sensor) and its collector (tavik-collector): a pair of sockets that keep the
/// borders of messages and carry descriptors.
///
/// Life of an agent as the collector sees it:
///   AgentStarted N   the agent of start number N runs, or is just being started. The message brings the read end of
///                    the response FIFO that was made for it and its bell.
///   AgentEnded N     it has ended. What it wrote may still be in its response FIFO: the collector empties that to its
///                    end, takes it in, deals with the page, and answers
///   Drained N        the keeper closes its own read end of that FIFO.
/// A collector that starts is told everything anew: for each ended agent that is not drained yet AgentStarted and
/// AgentEnded, for a running one AgentStarted, and then KeeperState. Start numbers rise and never repeat while a keeper
/// lives; a start number that the collector has seen before is the same agent.
///
/// The keeper ends a collector that sends no Look for gcLookLimit. Both ends send without waiting.
///
/// One thread at a time on each end. The descriptors of a link are close-on-exec.
#ifndef SENSOR_LINK_INCLUDE_LINK_H
#define SENSOR_LINK_INCLUDE_LINK_H

#include <sys/types.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>
#include <utility>

#include "sensor/client/include/FileDescriptor.h"

enum ZTELinkMessageType : std::uint32_t {
    // keeper to collector
    ZTLM_AgentStarted = 1,  ///< mStart, mPid, mRestarts, mText = path of its page, mResponseFifo, mBell
    ZTLM_AgentEnded = 2,    ///< mStart, mPid, mWaitStatus, mText = path of its page
    ZTLM_KeeperState = 3,   ///< mState, mSince, mNextStart, mRestarts, mText = why, for people
    ZTLM_StopAgent = 4,     ///< mStart: stop command, get until nothing is held, shut-down. The keeper starts the next
    ZTLM_Finish = 5,        ///< the same, wait for its AgentEnded, take everything in and end with status 0; all within
                            ///< gcFinishLimit. No agent is started after this message
    ZTLM_Reload = 6,        ///< mSettings: the settings have changed; readable as TAVIK_SETTINGS_FD is (Inheritance.h)
    // collector to keeper
    ZTLM_Look = 32,           ///< the collecting loop has turned: a look is completed, or a frame taken in
    ZTLM_StartAnswered = 33,  ///< mStart: this agent has answered its start command with success
    ZTLM_Silent = 34,         ///< mStart: this agent has sent no byte of an answer for gcSilenceLimit
    ZTLM_Drained = 35,        ///< mStart: nothing is left in the response FIFO of this agent, which has ended
    ZTLM_Text = 36            ///< mText: one line for people (the service manager's status text)
};

/// What the keeper is doing about the agent.
enum ZTEKeeperState : std::uint32_t {
    ZTKS_Starting = 0,            ///< an agent was started and has not answered a start command yet
    ZTKS_Running = 1,             ///< it has
    ZTKS_WaitingForAdapters = 2,  ///< no adapters or no library: no agent runs until that may have changed
    ZTKS_WaitingToRestart = 3,    ///< the agent has ended; the next one is started at mNextStart
    ZTKS_Stopping = 4             ///< an orderly stop is under way
};

/// "starting", "running", "waiting-for-adapters", "waiting-to-restart" or "stopping".
const char* keeperStateName(ZTEKeeperState aState);

/// The collector sends a Look at least this often, also when no agent runs and when the disk is full.
inline constexpr std::chrono::seconds gcLookPeriod{10};
/// A collector that has sent no Look for this long counts as hung.
inline constexpr std::chrono::seconds gcLookLimit{120};
/// An agent that sends no byte of an answer for this long counts as hung.
inline constexpr std::chrono::seconds gcSilenceLimit{60};
/// An orderly stop is over after this time.
inline constexpr std::chrono::seconds gcFinishLimit{20};

/// Largest text of a message in bytes. The paths in messages are shorter: they lie beside a socket's path, which the
/// system limits to 107 bytes.
inline constexpr std::size_t gcMaxLinkText = 1024;

/// One message. Of the members those count that the comment of its type names; the others are 0, empty, not open.
struct ZTSLinkMessage {
    ZTELinkMessageType mType = ZTLM_Look;
    std::uint64_t mStart = 0;     ///< start number of an agent; 1 is the keeper's first
    pid_t mPid = 0;               ///< the agent's
    std::uint64_t mRestarts = 0;  ///< how often an agent was started again since the keeper started
    int mWaitStatus = 0;          ///< as waitpid() gives it
    ZTEKeeperState mState = ZTKS_Starting;
    std::int64_t mSince = 0;      ///< seconds since the epoch: since when the state holds
    std::int64_t mNextStart = 0;  ///< seconds since the epoch: when an agent is started next; 0 = not planned
    std::string mText;            ///< at most gcMaxLinkText bytes; send() cuts a longer Text and refuses a longer path
    ZTCFileDescriptor mResponseFifo;  ///< read end, non-blocking
    ZTCFileDescriptor mBell;          ///< eventfd, non-blocking
    ZTCFileDescriptor mSettings;      ///< file with the text of the settings
};

enum ZTELinkResult {
    ZTLR_Done,     ///< sent, or received
    ZTLR_NotNow,   ///< nothing to receive; or no room to send, errno says why: try again later
    ZTLR_PeerGone  ///< the other end is closed: the keeper, or the collector, has ended
};

class ZTCLink {
public:
    ZTCLink() = default;
    /// @param aSocket  one end of a pair; made non-blocking and close-on-exec here. Throws ZTCSystemCallEx.
    explicit ZTCLink(ZTCFileDescriptor aSocket);

    /// Both ends of a new link: the keeper's and the collector's. Throws ZTCSystemCallEx.
    static std::pair<ZTCLink, ZTCLink> makePair();

    /// To be polled: readable when receive() has something to return. -1 where the link is closed.
    int getDescriptor() const { return mSocket.get(); }
    bool isOpen() const { return mSocket.isOpen(); }
    void close() noexcept { mSocket.reset(); }

    /// Sends a message, never waits. The message keeps its descriptors: the other end gets duplicates. Throws
    /// ZTCBadInputEx where a descriptor that the type needs is not open or a path is too long, ZTCSystemCallEx.
    ZTELinkResult send(const ZTSLinkMessage& acrMessage);

    /// Receives one message, never waits. Descriptors come close-on-exec. Throws ZTCBadInputEx for a packet that is not
    /// a message (its descriptors are closed, the next message can be received), ZTCSystemCallEx.
    ZTELinkResult receive(ZTSLinkMessage& arMessage);

private:
    ZTCFileDescriptor mSocket;
};

#endif
