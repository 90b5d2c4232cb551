// The agent as a process, and its response FIFO.
//
// | benchmark        | workload                                                                                      |
// |------------------|-----------------------------------------------------------------------------------------------|
// | FifoResponse     | responses of 300 KiB sent by the agent's own writer to a thread that reads 64 KiB at a time   |
// | FifoPlain        | floor: blocking writes of the same size into a FIFO, read the same way                        |
// | Start/<boards>   | milliseconds from the fork of qrv-tvk to its "Waiting for control availability" in the log,   |
// |                  | with 1, 8 or 64 adapters, in the foreground, its FIFOs' reader there already                  |
// | StartTrue        | floor: milliseconds from the fork of /bin/true to its end                                     |
// | Idle             | a qrv-tvk that has started and gets nothing to do, for TAVIK_BENCH_IDLE_SECONDS (60): seconds |
// |                  | of processor time by the kernel's ticks, wake-ups a second of all threads (voluntary context  |
// |                  | switches), resident KiB                                                                       |

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "bench/support/BenchAgent.h"
#include "system/include/ProtocolHelper.h"

namespace {

constexpr std::size_t scResponseSize = 300 * 1024;
constexpr const char* scReadyText = "Waiting for control availability";

using Clock = std::chrono::steady_clock;

double sSecondsSince(Clock::time_point aBegin) {
    return std::chrono::duration<double>(Clock::now() - aBegin).count();
}

/// Reads a FIFO in a thread of its own until its last writer has gone.
class ZTCFifoReader {
public:
    explicit ZTCFifoReader(const std::string& acrPath)
        : mDescriptor(open(acrPath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC)), mThread([this] { run(); }) {}
    ~ZTCFifoReader() {
        mIsOver = true;
        mThread.join();
        close(mDescriptor);
    }
    ZTCFifoReader(const ZTCFifoReader&) = delete;
    ZTCFifoReader& operator=(const ZTCFifoReader&) = delete;

private:
    void run() {
        std::vector<char> lBytes(64 * 1024);
        while (!mIsOver) {
            pollfd lWait{mDescriptor, POLLIN, 0};
            poll(&lWait, 1, 20);
            while (read(mDescriptor, lBytes.data(), lBytes.size()) > 0) {
            }
        }
    }

    int mDescriptor;
    std::atomic<bool> mIsOver{false};
    std::thread mThread;
};

void sFifoResponse(benchmark::State& arState) {
    ZTCBenchAgent& lrAgent = ZTCBenchAgent::use(1);
    const ZTCPointer<ZTCBuffer> lResponse(new ZTCBuffer());
    lResponse->resize(scResponseSize);
    const ZTCFifoReader lReader(lrAgent.system().getTvkOutIpcPath().get());
    const ZTCPointer<ZTCWriter> lWriter = lrAgent.system().getWriter(0);
    ZTCProtocolHelper lHelper;
    for (auto lUnused : arState) {
        lHelper.send(lWriter, lResponse, 0);
    }
    arState.SetBytesProcessed(arState.iterations() * static_cast<std::int64_t>(scResponseSize));
}

void sFifoPlain(benchmark::State& arState) {
    const std::string lPath = ZTCBenchAgent::directory() + "/plain.fifo";
    unlink(lPath.c_str());
    if (mkfifo(lPath.c_str(), 0600) != 0) {
        throw std::runtime_error("mkfifo " + lPath);
    }
    const ZTCFifoReader lReader(lPath);
    const int lWriter = open(lPath.c_str(), O_WRONLY | O_CLOEXEC);
    const std::vector<char> lBytes(scResponseSize);
    for (auto lUnused : arState) {
        std::size_t lWritten = 0;
        while (lWritten < lBytes.size()) {
            const ssize_t lCount = write(lWriter, lBytes.data() + lWritten, lBytes.size() - lWritten);
            if (lCount <= 0) {
                arState.SkipWithError("write failed");
                break;
            }
            lWritten += static_cast<std::size_t>(lCount);
        }
    }
    close(lWriter);
    arState.SetBytesProcessed(arState.iterations() * static_cast<std::int64_t>(scResponseSize));
}

/// A real agent with a directory of its own; ends with the object.
class ZTCStartedAgent {
public:
    explicit ZTCStartedAgent(unsigned aBoards) : mDirectory(ZTCBenchAgent::directory() + "/process") {
        std::filesystem::remove_all(mDirectory);
        std::filesystem::create_directory(mDirectory);
        const std::string lFifo = mDirectory + "/qrvtvkout.fifo";
        if (mkfifo(lFifo.c_str(), 0600) != 0) {
            throw std::runtime_error("mkfifo " + lFifo);
        }
        mReader = open(lFifo.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        mLog = open((mDirectory + "/agent.log").c_str(), O_RDONLY | O_CREAT | O_CLOEXEC, 0640);
        mNotify = inotify_init1(IN_CLOEXEC);
        inotify_add_watch(mNotify, (mDirectory + "/agent.log").c_str(), IN_MODIFY);

        setenv("ZT_QRV_SENSOR_DIR", mDirectory.c_str(), 1);
        setenv("ZT_LIBKPM_PATH", TAVIK_BENCH_LIBKPM, 1);
        setenv("TAVIK_BENCH_ADAPTERS", std::to_string(aBoards).c_str(), 1);
        const std::string lLog = mDirectory + "/agent.log";
        mPid = fork();
        if (mPid == 0) {
            // Until its command line is read, the agent logs into a file of its working directory.
            if (chdir(mDirectory.c_str()) != 0) {
                _exit(127);
            }
            execl(TAVIK_BENCH_AGENT, "qrv-tvk", "-D", "false", "-d", "127", "-l", lLog.c_str(), nullptr);
            _exit(127);
        }
    }
    ~ZTCStartedAgent() {
        kill(mPid, SIGTERM);
        waitpid(mPid, nullptr, 0);
        close(mReader);
        close(mLog);
        close(mNotify);
    }
    ZTCStartedAgent(const ZTCStartedAgent&) = delete;
    ZTCStartedAgent& operator=(const ZTCStartedAgent&) = delete;

    void waitUntilReady() const {
        std::string lText;
        while (lText.find(scReadyText) == std::string::npos) {
            pollfd lWait{mNotify, POLLIN, 0};
            if (poll(&lWait, 1, 10000) <= 0) {
                throw std::runtime_error("the agent does not start; its log: " + lText);
            }
            char lBytes[16384];
            [[maybe_unused]] const ssize_t lNotes = read(mNotify, lBytes, sizeof lBytes);
            for (ssize_t lCount; (lCount = read(mLog, lBytes, sizeof lBytes)) > 0;) {
                lText.append(lBytes, static_cast<std::size_t>(lCount));
            }
        }
    }

    std::string processDirectory() const { return "/proc/" + std::to_string(mPid); }

private:
    std::string mDirectory;
    int mReader;
    int mLog;
    int mNotify;
    pid_t mPid;
};

void sStart(benchmark::State& arState) {
    for (auto lUnused : arState) {
        const Clock::time_point lBegin = Clock::now();
        const ZTCStartedAgent lAgent(static_cast<unsigned>(arState.range(0)));
        lAgent.waitUntilReady();
        arState.SetIterationTime(sSecondsSince(lBegin));
    }
}

void sStartTrue(benchmark::State& arState) {
    for (auto lUnused : arState) {
        const Clock::time_point lBegin = Clock::now();
        const pid_t lChild = fork();
        if (lChild == 0) {
            execl("/bin/true", "true", nullptr);
            _exit(127);
        }
        waitpid(lChild, nullptr, 0);
        arState.SetIterationTime(sSecondsSince(lBegin));
    }
}

/// The number behind this name in a status file of the kernel.
long sReadStatus(const std::string& acrPath, const std::string& acrName) {
    std::ifstream lFile(acrPath);
    for (std::string lLine; std::getline(lFile, lLine);) {
        if (lLine.starts_with(acrName)) {
            return std::stol(lLine.substr(acrName.size()));
        }
    }
    throw std::runtime_error(acrName + " is not in " + acrPath);
}

long sCountWakeUps(const ZTCStartedAgent& acrAgent) {
    long lSum = 0;
    for (const auto& lrTask : std::filesystem::directory_iterator(acrAgent.processDirectory() + "/task")) {
        lSum += sReadStatus(lrTask.path().string() + "/status", "voluntary_ctxt_switches:");
    }
    return lSum;
}

double sReadProcessorSeconds(const ZTCStartedAgent& acrAgent) {
    std::ifstream lFile(acrAgent.processDirectory() + "/stat");
    std::string lText;
    std::getline(lFile, lText);
    std::istringstream lFields(lText.substr(lText.rfind(')') + 2));
    std::string lSkipped;
    for (int i = 0; i < 11; ++i) {
        lFields >> lSkipped;
    }
    long lUser = 0;
    long lSystem = 0;
    lFields >> lUser >> lSystem;
    return static_cast<double>(lUser + lSystem) / static_cast<double>(sysconf(_SC_CLK_TCK));
}

void sIdle(benchmark::State& arState) {
    const char* const lpSeconds = std::getenv("TAVIK_BENCH_IDLE_SECONDS");
    const long lSeconds = lpSeconds == nullptr ? 60 : std::strtol(lpSeconds, nullptr, 10);
    for (auto lUnused : arState) {
        const ZTCStartedAgent lAgent(1);
        lAgent.waitUntilReady();
        const double lProcessor = sReadProcessorSeconds(lAgent);
        const long lWakeUps = sCountWakeUps(lAgent);
        std::this_thread::sleep_for(std::chrono::seconds(lSeconds));
        arState.counters["cpu_s"] = sReadProcessorSeconds(lAgent) - lProcessor;
        arState.counters["wakeups_per_s"] =
            static_cast<double>(sCountWakeUps(lAgent) - lWakeUps) / static_cast<double>(lSeconds);
        arState.counters["rss_KiB"] = static_cast<double>(sReadStatus(lAgent.processDirectory() + "/status", "VmRSS:"));
    }
}

}  // namespace

BENCHMARK(sFifoResponse)->Name("FifoResponse")->UseRealTime();
BENCHMARK(sFifoPlain)->Name("FifoPlain")->UseRealTime();
BENCHMARK(sStart)->Name("Start")->Arg(1)->Arg(8)->Arg(64)->Iterations(5)->UseManualTime()->Unit(
    benchmark::kMillisecond);
BENCHMARK(sStartTrue)->Name("StartTrue")->Iterations(5)->UseManualTime()->Unit(benchmark::kMillisecond);
BENCHMARK(sIdle)->Name("Idle")->Iterations(1);

BENCHMARK_MAIN();
