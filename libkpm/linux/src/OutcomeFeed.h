/// The feed of SCSI outcomes: opens the trace instance, sets its filter to the present hosts, reads its buffers, and
/// delivers queue full, device busy and check condition. Where sense data come by a probe, it reads the probe's buffers
/// too. It reports its own state, and opens its source again after a failure.
///
/// Used by the library's thread alone (and by start(), before there is one), save for getState().get().
#ifndef LIBKPM_LINUX_SRC_OUTCOMEFEED_H
#define LIBKPM_LINUX_SRC_OUTCOMEFEED_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "libkpm/common/include/Losses.h"
#include "libkpm/linux/src/Delivery.h"
#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/HostWatcher.h"
#include "libkpm/linux/src/QueueDepths.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/SenseMatcher.h"
#include "libkpm/linux/src/SenseProbe.h"
#include "libkpm/linux/src/TraceInstance.h"

class ZTCLinuxOutcomeFeed {
public:
    /// All but the place outlive the feed.
    ZTCLinuxOutcomeFeed(ZTSTracePlace aPlace, ZTCTraceFiles& arFiles, ZTCLinuxHostWatcher& arWatcher,
                        ZTCLinuxQueueDepths& arDepths, const ZTCLinuxDelivery& acrDelivery, ZTCLosses& arLosses);

    /// The hosts may have changed: the instance is opened, if it was not tried before, and its filter follows them.
    void noteHosts();

    std::size_t getBufferCount() const { return mBuffers.size(); }

    /// The descriptor to wait for; -1 where the buffer is not to be waited for.
    int getDescriptor(std::size_t aBuffer) const;

    /// The buffer's descriptor is readable.
    void markReady(std::size_t aBuffer) { mBuffers[aBuffer].mState = ZTBS_Ready; }

    /// Reads the buffers that are marked, each up to a limit, so that the other sources have their turn.
    void serve();

    /// A regular look, after the watcher's: every buffer is read, whether it was said to be readable or not, and asked
    /// for its losses.
    void look();

    /// The library is closing: recording ends, and what is left in the buffers is delivered.
    void stop() { happen(ZTFH_Stop); }

    /// When an outcome has waited long enough for its sense data; nothing where none waits.
    std::optional<std::chrono::steady_clock::time_point> getNextTime() const { return mMatcher.getNextTime(); }

    const ZTCFeedState& getState() const { return mState; }

    /// Why check conditions come without sense data; empty where they have them, or nothing is open.
    const std::string& getSenseProblem() const { return mSenseProblem; }

    /// Why outcomes of this host are missing while the feed works: the host came after the last filter that the kernel
    /// accepted. Empty where they come.
    std::string getHostProblem(std::uint32_t aHost) const;

    /// Counts the changes of what the three above say.
    std::uint64_t getChanges() const { return mState.getChanges() + mFilterChanges; }

private:
    enum ZTEBufferState : std::uint8_t {
        ZTBS_Waiting,
        ZTBS_Ready,   ///< to be read
        ZTBS_Resting  ///< was said to be readable and was not: left alone until the next look
    };

    struct Buffer {
        ZTCTraceBuffers* mpBuffers;  // of the trace instance, or of the probe
        std::size_t mIndex;          // among those
        bool mIsOfProbe;
        ZTEBufferState mState = ZTBS_Waiting;
        bool mHasRecords = false;  ///< was read from since its losses were looked at
        bool mHasLoss = false;     ///< a page said so since then
    };

    void happen(ZTEFeedHappening aHappening, const std::string& acrReason = std::string());
    void open();
    void close();
    void drain();
    void tell() const;
    void followHosts();
    void addBuffers(ZTCTraceBuffers& arBuffers, bool aIsOfProbe);
    void readBuffer(Buffer& arBuffer);
    bool readPage(ZTCByteSpan aPage, const Buffer& acrBuffer);
    void readOutcome(ZTCByteSpan aRecord, std::uint64_t aTime);
    void readSense(ZTCByteSpan aRecord, std::uint64_t aTime);
    void openProbe();
    void deliverMatched(const std::vector<ZTSScsiOutcome>& acrOutcomes);
    void readLosses();
    void handle(const ZTSScsiOutcome& acrOutcome);

    // Constant after construction.
    const ZTSTracePlace mPlace;
    ZTCTraceFiles& mrFiles;
    ZTCLinuxHostWatcher& mrWatcher;
    ZTCLinuxQueueDepths& mrDepths;  // notified of each queue full
    const ZTCLinuxDelivery& mrDelivery;
    ZTCLosses& mrLosses;

    // Used by the library's thread alone.
    ZTCFeedState mState;
    ZTCRetryPause mPause;
    std::unique_ptr<ZTCSenseProbe> mpProbe;     // where sense data come by it
    std::unique_ptr<ZTCTraceInstance> mpTrace;  // set while the state is Working
    ZTCSenseMatcher mMatcher;                   // check conditions that wait for their sense data
    std::vector<Buffer> mBuffers;
    std::uint64_t mHostsVersion = 0;            // of the hosts that the filter names; 0: to be set
    std::vector<std::uint32_t> mFilteredHosts;  // that the filter in use names, in ascending order
    std::string mFilterProblem;                 // as last reported; empty while the filter names all hosts
    std::uint64_t mFilterChanges = 0;
    std::string mSenseProblem;
    std::vector<std::uint8_t> mPage;
};

#endif
