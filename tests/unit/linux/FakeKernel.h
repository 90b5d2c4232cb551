/// What the kernel does for the library, played in a directory of the test's own: a sysfs tree, a tracefs tree whose
/// instances get their files when they are made, and a source of FC events.
#ifndef TESTS_UNIT_LINUX_FAKEKERNEL_H
#define TESTS_UNIT_LINUX_FAKEKERNEL_H

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "libkpm/linux/src/Engine.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/linux/KernelBytes.h"
#include "tests/unit/linux/LinuxLog.h"

/// The trees below /sys and /sys/kernel/tracing.
class ZTCFakeKernel : public ZTCLinuxSources {
public:
    ZTCFakeKernel();
    ~ZTCFakeKernel() override;

    std::string sysfs() const { return mDirectory.path("sys"); }
    std::string tracefs() const { return mDirectory.path("tracing"); }
    ZTSLinuxOptions options() const;

    // ---- sysfs ----
    /// A host with node name 0x2000...NN and port name 0x1000...NN, Online with FC id 0x0100NN; NN is aName, or the
    /// host's number plus 1.
    void addHost(std::uint32_t aHost, std::uint32_t aName = 0);
    void removeHost(std::uint32_t aHost);
    /// Writes an attribute in one step, as a reader of sysfs sees it.
    void setHost(std::uint32_t aHost, const std::string& acrAttribute, const std::string& acrText);
    void setState(std::uint32_t aHost, const char* apState) {
        setHost(aHost, "port_state", std::string(apState) + "\n");
    }
    void setAttribute(const std::string& acrName, const std::string& acrText);
    void removeClass(const std::string& acrName);
    void addTarget(std::uint32_t aHost, std::uint32_t aChannel, std::uint32_t aTarget, const std::string& acrName);
    void addRport(std::uint32_t aHost, std::uint32_t aNumber, std::int64_t aTarget, const std::string& acrName);

    /// A SCSI device of this name ("HOST:CHANNEL:TARGET:LUN").
    void setDepth(const std::string& acrLun, std::uint32_t aDepth) {
        setAttribute("scsi_device/" + acrLun + "/device/queue_depth", std::to_string(aDepth) + "\n");
    }

    // ---- FC events ----
    std::unique_ptr<ZTCFcEventSource> openFcEvents(ZTSFeedProblem& arProblem) override;
    /// Says one outcome of receive, with these bytes.
    void sendFc(ZTELinuxReceived aOutcome, const ZTCBytes& acrBytes = {});
    void sendFc(const ZTSFcMessage& acrMessage) { sendFc(ZTLR_Datagram, acrMessage.make()); }
    /// From now on, the outcomes wait until they are let go together.
    void holdFc();
    void releaseFc();
    bool isFcDrained() const;

    std::atomic<bool> mRefusesFcEvents{false};

    // ---- tracefs ----
    int make(const std::string& acrPath) override;
    /// As the kernel does, keeps an instance that has files open outside of this object.
    int remove(const std::string& acrPath) override;
    int write(const std::string& acrPath, std::string_view aText) override;
    /// The list of dynamic probes: one that is on in an instance is kept.
    int append(const std::string& acrPath, std::string_view aText) override;
    /// From now on, writing or appending a text with this in it to a control file of this name fails with the error
    /// number, so many times.
    void refuseWrites(const std::string& acrName, const std::string& acrText, int aError, unsigned aTimes = ~0u);
    /// From now on, none fails.
    void allowWrites();

    /// The groups of dynamic probes there are.
    std::vector<std::string> probes() const;
    /// The kernel's description of its types, with the SCSI structures.
    void addTypes();
    /// Adds the files of a dynamic probe to the root and to the instances that this object has made or filled.
    void addProbe(const std::string& acrGroup);

    /// Writes a page to a processor's buffer, of the instance of finished commands or of that of sense data.
    void sendPage(const ZTCBytes& acrPage, unsigned aProcessor = 0) { sendTo(mInstance, acrPage, aProcessor); }
    void sendSensePage(const ZTCBytes& acrPage, unsigned aProcessor = 0) { sendTo(mSense, acrPage, aProcessor); }
    void sendSense(const ZTSSenseRecordBytes& acrRecord, unsigned aProcessor = 0) {
        sendSensePage(ZTCPageBuilder().addShort(acrRecord.make()).make(), aProcessor);
    }
    void sendDone(const ZTSDoneRecord& acrRecord, unsigned aProcessor = 0) {
        sendPage(ZTCPageBuilder().addShort(acrRecord.make()).make(), aProcessor);
    }
    /// The instance of finished commands that was made or filled last, and that of sense data.
    std::string instance() const { return mInstance; }
    std::string senseInstance() const { return mSense; }
    std::string instanceFile(const std::string& acrName) const { return readFile(mInstance + "/" + acrName); }
    std::string senseFile(const std::string& acrName) const { return readFile(mSense + "/" + acrName); }
    std::vector<std::string> instances() const;

    std::atomic<int> mMakeError{0};
    unsigned mProcessors = 2;
    std::string mSenseFormat = senseFormat();
    std::string mFormat = doneFormat();
    std::string mHeaderPage = headerPage();
    bool mHasBufferPercent = true;
    std::string mStoredPercent{};  ///< what the kernel makes of any buffer_percent; empty: it stores what is written
    bool mHasFilter = true;

    /// The files of an instance in a directory that is there. One with "sense" in its name is that of sense data.
    void fillInstance(const std::string& acrPath);

private:
    friend class ZTCFakeFcSource;

    void addProbeTo(const std::string& acrRoot, const std::string& acrGroup) const;
    void sendTo(const std::string& acrInstance, const ZTCBytes& acrPage, unsigned aProcessor);
    int refuse(const std::string& acrPath, std::string_view aText);
    bool isOpenElsewhere(const std::string& acrPath) const;

    struct Refusal {
        std::string mName;
        std::string mText;
        int mError;
        unsigned mTimes;
    };

    ZTCTemporaryDirectory mDirectory;
    std::map<std::pair<std::string, unsigned>, ZTCLibraryDescriptor> mPipes;  // by instance and processor
    std::string mInstance;
    std::string mSense;

    mutable std::mutex mLock;
    ZTCLibraryDescriptor mFcWake;
    bool mIsHeld = false;                                         // guarded by mLock
    std::deque<std::pair<ZTELinuxReceived, ZTCBytes>> mOutcomes;  // guarded by mLock
    std::vector<Refusal> mRefusals;                               // guarded by mLock
};

/// The name "0x1000...NN".
std::string portNameText(std::uint32_t aName);
HBA_wwn portName(std::uint32_t aName);
HBA_wwn nodeName(std::uint32_t aName);

#endif
