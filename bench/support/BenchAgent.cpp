#include "bench/support/BenchAgent.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <stdexcept>
#include <system_error>
#include <tuple>

#include "bench/support/BenchEvents.h"
#include "common/include/Log.h"
#include "common/include/NetworkOrder.h"
#include "os/common/include/ProcessEvents.h"
#include "sensor/agentcommon/include/StatusPage.h"
#include "system/include/SystemGlobals.h"

namespace {

constexpr unsigned scRecordLimit = 4096;

void sAppend32(std::vector<unsigned char>& arBytes, unsigned aValue) {
    for (int lShift = 24; lShift >= 0; lShift -= 8) {
        arBytes.push_back(static_cast<unsigned char>(aValue >> lShift));
    }
}

void sAppendName(std::vector<unsigned char>& arBytes, std::uint64_t aValue) {
    const HBA_wwn lName = makeBenchName(aValue);
    arBytes.insert(arBytes.end(), lName.wwn, lName.wwn + sizeof lName.wwn);
}

void sReadFully(int aDescriptor, unsigned char* apTo, std::size_t aCount) {
    while (aCount > 0) {
        const ssize_t lCount = read(aDescriptor, apTo, aCount);
        if (lCount <= 0) {
            throw std::runtime_error("reading a response");
        }
        apTo += lCount;
        aCount -= static_cast<std::size_t>(lCount);
    }
}

std::string sMakeDirectory() {
    std::string lPath = (std::filesystem::temp_directory_path() / "tavik-bench-XXXXXX").string();
    if (mkdtemp(lPath.data()) == nullptr) {
        throw std::runtime_error("mkdtemp " + lPath);
    }
    return lPath;
}

}  // namespace

const std::string& ZTCBenchAgent::directory() {
    static pid_t sOwner = 0;
    static const std::string& srDirectory = *[] {
        auto* const lpDirectory = new std::string(sMakeDirectory());
        sOwner = getpid();
        setLogFilePath((*lpDirectory + "/bench.log").c_str());
        std::atexit([] {
            // A child that was forked leaves its parent's files alone.
            if (getpid() == sOwner) {
                std::error_code lIgnored;
                std::filesystem::remove_all(directory(), lIgnored);
            }
        });
        return lpDirectory;
    }();
    return srDirectory;
}

ZTCBenchAgent::ZTCBenchAgent(unsigned aBoards, unsigned aTargets, bool aHasStatusPage) : mpSystem(nullptr) {
    static unsigned sAgents = 0;
    const std::string lDirectory = directory() + "/agent-" + std::to_string(getpid()) + "-" + std::to_string(++sAgents);
    std::filesystem::create_directory(lDirectory);
    setenv("ZT_QRV_SENSOR_DIR", lDirectory.c_str(), 1);
    setenv("ZT_LIBKPM_PATH", TAVIK_BENCH_LIBKPM, 1);
    setenv("TAVIK_BENCH_ADAPTERS", std::to_string(aBoards).c_str(), 1);
    setenv(gcStatusPageVariable, aHasStatusPage ? (lDirectory + "/page").c_str() : "", 1);

    // A reader of the response FIFO, so that init does not wait for one.
    const std::string lFifo = lDirectory + "/qrvtvkout.fifo";
    if (mkfifo(lFifo.c_str(), 0600) != 0) {
        throw std::runtime_error("mkfifo " + lFifo);
    }
    mResponseReader = open(lFifo.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (mResponseReader < 0) {
        throw std::runtime_error("open " + lFifo);
    }
    mpSystem = new ZTCTavikSystem(ZTCString(gcTavikName));
    setSystemObject(mpSystem);
    setLogCode(gcQuietLogCode);
    mpSystem->preInit();
    setLogCode(gcQuietLogCode);
    mpSystem->init();
    std::vector<unsigned char> lStart{0};
    sAppend32(lStart, scRecordLimit);
    request(lStart);
    if (aTargets != 0) {
        request(makeRegisterTargets(aTargets));
    }
}

ZTCBenchAgent::~ZTCBenchAgent() {
    mDoScopeCollection = false;
    gpTavikSystem = nullptr;
    setSystemObject(nullptr);
    delete mpSystem;
    close(mResponseReader);
}

ZTCBenchAgent& ZTCBenchAgent::use(unsigned aBoards, unsigned aTargets, unsigned aLogCode, bool aHasStatusPage) {
    static auto& srAgents = *new std::map<std::tuple<unsigned, unsigned, bool>, ZTCBenchAgent*>();
    ZTCBenchAgent*& lrpAgent = srAgents[{aBoards, aTargets, aHasStatusPage}];
    if (lrpAgent == nullptr) {
        lrpAgent = new ZTCBenchAgent(aBoards, aTargets, aHasStatusPage);
    }
    setenv("TAVIK_BENCH_ADAPTERS", std::to_string(aBoards).c_str(), 1);
    gpTavikSystem = lrpAgent->mpSystem;
    setSystemObject(lrpAgent->mpSystem);
    mDoScopeCollection = true;
    setLogCode(aLogCode);
    lrpAgent->retrieve();
    return *lrpAgent;
}

ZTCPointer<ZTCBuffer> ZTCBenchAgent::request(const std::vector<unsigned char>& acrBody) {
    const ZTCPointer<ZTCBuffer> lRequest(new ZTCBuffer());
    lRequest->append(acrBody.data(), static_cast<Size>(acrBody.size()));
    ZTCPointer<ZTCBuffer> lResponse;
    mpSystem->getProtocolHandler()->process(lRequest, lResponse);
    return lResponse;
}

void ZTCBenchAgent::startThreads() {
    getExitEvent().reset();
    mCommandWriter = open(mpSystem->getTvkCmdIpcPath().get(), O_WRONLY | O_CLOEXEC);
    if (mCommandWriter < 0 || fcntl(mResponseReader, F_SETFL, 0) != 0) {
        throw std::runtime_error("opening the sensor's ends of the FIFOs");
    }
    mpSystem->createThreads();
    mpSystem->startThreads();
}

void ZTCBenchAgent::stopThreads() {
    mpSystem->destroyThreads();
    getExitEvent().reset();
    close(mCommandWriter);
    mCommandWriter = -1;
}

std::size_t ZTCBenchAgent::requestOverPipes(const std::vector<unsigned char>& acrBody) {
    std::vector<unsigned char> lFrame;
    sAppend32(lFrame, static_cast<unsigned>(acrBody.size()));
    lFrame.insert(lFrame.end(), acrBody.begin(), acrBody.end());
    if (write(mCommandWriter, lFrame.data(), lFrame.size()) != static_cast<ssize_t>(lFrame.size())) {
        throw std::runtime_error("writing a command");
    }
    static auto& srBytes = *new std::vector<unsigned char>(1 << 20);
    sReadFully(mResponseReader, srBytes.data(), 4);
    const std::size_t lSize = loadFromNetworkOrder<std::uint32_t>(srBytes.data());
    if (srBytes.size() < lSize) {
        srBytes.resize(lSize);
    }
    sReadFully(mResponseReader, srBytes.data(), lSize);
    return lSize;
}

std::vector<unsigned char> ZTCBenchAgent::makeRegisterTargets(unsigned aTargets) {
    std::vector<unsigned char> lBody{3};
    sAppend32(lBody, aTargets);
    for (unsigned lTarget = 0; lTarget < aTargets; ++lTarget) {
        sAppendName(lBody, 0x2000000000000000 + lTarget);
        sAppendName(lBody, gcBenchPortBase + lTarget);
        sAppend32(lBody, lTarget + 1);
    }
    return lBody;
}
