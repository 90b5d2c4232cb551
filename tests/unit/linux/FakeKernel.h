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
#include <string>
#include <vector>

#include "libkpm/linux/src/Engine.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/linux/KernelBytes.h"

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

    // ---- FC events ----
    std::unique_ptr<ZTCFcEventSource> openFcEvents(std::string& arProblem) override;
    /// Says one outcome of receive, with these bytes.
    void sendFc(ZTELinuxReceived aOutcome, const ZTCBytes& acrBytes = {});
    void sendFc(const ZTSFcMessage& acrMessage) { sendFc(ZTLR_Datagram, acrMessage.make()); }
    /// From now on, the outcomes wait until they are let go together.
    void holdFc();
    void releaseFc();
    bool isFcDrained() const;

    bool mRefusesFcEvents = false;

    // ---- tracefs ----
    int make(const std::string& acrPath) override;
    int remove(const std::string& acrPath) override;

    /// Writes a page to a processor's buffer.
    void sendPage(const ZTCBytes& acrPage, unsigned aProcessor = 0);
    void sendDone(const ZTSDoneRecord& acrRecord, unsigned aProcessor = 0) {
        sendPage(ZTCPageBuilder().addShort(acrRecord.make()).make(), aProcessor);
    }
    std::string instance() const;
    std::string instanceFile(const std::string& acrName) const { return readFile(instance() + "/" + acrName); }
    std::vector<std::string> instances() const;

    int mMakeError = 0;
    unsigned mProcessors = 2;
    std::string mFormat = doneFormat();
    std::string mHeaderPage = headerPage();
    bool mHasBufferPercent = true;
    bool mHasFilter = true;

private:
    friend class ZTCFakeFcSource;

    ZTCTemporaryDirectory mDirectory;
    std::map<unsigned, ZTCLibraryDescriptor> mPipes;
    std::string mInstance;

    mutable std::mutex mLock;
    ZTCLibraryDescriptor mFcWake;
    bool mIsHeld = false;                                         // guarded by mLock
    std::deque<std::pair<ZTELinuxReceived, ZTCBytes>> mOutcomes;  // guarded by mLock
};

/// The name "0x1000...NN".
std::string portNameText(std::uint32_t aName);
HBA_wwn portName(std::uint32_t aName);
HBA_wwn nodeName(std::uint32_t aName);

/// The lines that the library logs while it is there.
class ZTCLinuxLog {
public:
    ZTCLinuxLog();
    ~ZTCLinuxLog();
    ZTCLinuxLog(const ZTCLinuxLog&) = delete;
    ZTCLinuxLog& operator=(const ZTCLinuxLog&) = delete;

    /// "LEVEL TEXT"
    std::vector<std::string> lines() const;
    /// How many contain this text.
    std::size_t count(const std::string& acrText) const;
    std::string all() const;
};

#endif
