#include "tests/support/ScriptedLibrary.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <stdexcept>

#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"

[[noreturn]] static void sFail(const std::string& acrWhat) {
    throw std::runtime_error("scripted library: " + acrWhat +
                             (errno != 0 ? std::string(": ") + std::strerror(errno) : ""));
}

ZTCScriptedLibrary::ZTCScriptedLibrary(const std::string& acrDirectory) : mDirectory(acrDirectory) {
    const std::string lPath = mDirectory + "/scripted.sock";
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    errno = 0;
    if (lPath.size() >= sizeof(lAddress.sun_path)) {
        sFail("the path " + lPath + " is too long for a socket");
    }
    std::memcpy(lAddress.sun_path, lPath.c_str(), lPath.size());
    mListener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (mListener < 0 || bind(mListener, reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)) != 0 ||
        listen(mListener, 8) != 0) {
        sFail("cannot listen on " + lPath);
    }
    writeFile(mDirectory + "/scripted.conf", "");
    writeFile(mDirectory + "/scripted.calls", "");
}

ZTCScriptedLibrary::~ZTCScriptedLibrary() {
    if (mConnection >= 0) {
        close(mConnection);
    }
    close(mListener);
}

std::string ZTCScriptedLibrary::modulePath() {
    return TAVIK_SCRIPTED_LIBRARY;
}

void ZTCScriptedLibrary::configure(const std::string& acrLine) {
    if (isOpen()) {
        request("configure " + acrLine);
    } else {
        std::ofstream lFile(mDirectory + "/scripted.conf", std::ios::app);
        lFile << acrLine << '\n';
    }
}

void ZTCScriptedLibrary::addAdapter(const ZTSWwn& acrNodeName, const ZTSWwn& acrPortName) {
    configure("adapter " + hexOf(ZTCByteWriter().wwn(acrNodeName).bytes()) + " " +
              hexOf(ZTCByteWriter().wwn(acrPortName).bytes()));
    ++mAdapters;
}

void ZTCScriptedLibrary::addAdapters(unsigned aCount) {
    for (unsigned i = 0; i < aCount; ++i) {
        const unsigned lBoard = mAdapters;
        addAdapter(nodeName(lBoard), portName(lBoard));
    }
}

void ZTCScriptedLibrary::deliver(const ZTSLibraryEvent& acrEvent, unsigned aThread) {
    request("deliver " + std::to_string(aThread) + " " + acrEvent.text());
}

static std::string sTextOf(const std::vector<ZTSLibraryEvent>& acrEvents) {
    std::string lText = std::to_string(acrEvents.size());
    for (const ZTSLibraryEvent& lcrEvent : acrEvents) {
        lText += " " + lcrEvent.text();
    }
    return lText;
}

void ZTCScriptedLibrary::deliverAll(const std::vector<ZTSLibraryEvent>& acrEvents) {
    startStorm(1, 1, acrEvents);
    waitForStorm();
}

void ZTCScriptedLibrary::startStorm(unsigned aThreads, std::uint64_t aRounds,
                                    const std::vector<ZTSLibraryEvent>& acrEvents) {
    request("storm " + std::to_string(aThreads) + " " + std::to_string(aRounds) + " " + sTextOf(acrEvents));
}

std::uint64_t ZTCScriptedLibrary::waitForStorm() {
    return std::stoull(request("wait-storm"));
}

std::uint64_t ZTCScriptedLibrary::stopStorm() {
    return std::stoull(request("stop-storm"));
}

bool ZTCScriptedLibrary::takeConnection(int aMilliseconds) {
    pollfd lPoll{mListener, POLLIN, 0};
    if (poll(&lPoll, 1, aMilliseconds) <= 0) {
        return false;
    }
    const int lConnection = accept4(mListener, nullptr, nullptr, SOCK_CLOEXEC);
    if (lConnection < 0) {
        sFail("accept");
    }
    if (mConnection >= 0) {
        close(mConnection);
        mBuffered.clear();
    }
    mConnection = lConnection;
    return true;
}

bool ZTCScriptedLibrary::isOpen() {
    while (takeConnection(0)) {
    }
    char lByte = 0;
    if (mConnection >= 0 && recv(mConnection, &lByte, 1, MSG_PEEK | MSG_DONTWAIT) == 0) {
        close(mConnection);
        mConnection = -1;
        mBuffered.clear();
    }
    return mConnection >= 0;
}

void ZTCScriptedLibrary::letGo() {
    request("let-go");
}

void ZTCScriptedLibrary::waitUntilOpen() {
    // An agent that was started later takes the place of the one before.
    while (takeConnection(0)) {
    }
    errno = 0;
    if (mConnection < 0 && !takeConnection(ZTCDeadline().remainingMilliseconds())) {
        sFail("the agent has not opened the library");
    }
}

std::vector<std::string> ZTCScriptedLibrary::calls() const {
    std::vector<std::string> lCalls;
    const std::string lContent = readFile(mDirectory + "/scripted.calls");
    std::size_t lBegin = 0;
    for (std::size_t lEnd = lContent.find('\n'); lEnd != std::string::npos; lEnd = lContent.find('\n', lBegin)) {
        lCalls.push_back(lContent.substr(lBegin, lEnd - lBegin));
        lBegin = lEnd + 1;
    }
    return lCalls;
}

std::vector<std::string> ZTCScriptedLibrary::callsOf(const std::string& acrPrefix) const {
    std::vector<std::string> lCalls;
    for (const std::string& lcrCall : calls()) {
        if (lcrCall.starts_with(acrPrefix)) {
            lCalls.push_back(lcrCall);
        }
    }
    return lCalls;
}

void ZTCScriptedLibrary::waitForCall(const std::string& acrPrefix) const {
    waitUntil([&] { return !callsOf(acrPrefix).empty(); }, "the call " + acrPrefix + " to the adapters' library");
}

std::string ZTCScriptedLibrary::request(const std::string& acrLine) {
    waitUntilOpen();
    const std::string lLine = acrLine + "\n";
    for (std::size_t lSent = 0; lSent < lLine.size();) {
        const ssize_t lCount = send(mConnection, lLine.data() + lSent, lLine.size() - lSent, MSG_NOSIGNAL);
        if (lCount < 0 && errno != EINTR) {
            sFail("the library does not take requests any more");
        }
        lSent += lCount > 0 ? static_cast<std::size_t>(lCount) : 0;
    }
    const ZTCDeadline lDeadline(3 * gcTestPatience);
    std::size_t lEnd = mBuffered.find('\n');
    while (lEnd == std::string::npos) {
        pollfd lPoll{mConnection, POLLIN, 0};
        errno = 0;
        if (poll(&lPoll, 1, lDeadline.remainingMilliseconds()) <= 0) {
            sFail("no reply to: " + acrLine.substr(0, 80));
        }
        char lChunk[4096];
        const ssize_t lCount = recv(mConnection, lChunk, sizeof(lChunk), 0);
        if (lCount <= 0) {
            errno = 0;
            sFail("closed before it replied to: " + acrLine.substr(0, 80));
        }
        mBuffered.append(lChunk, static_cast<std::size_t>(lCount));
        lEnd = mBuffered.find('\n');
    }
    const std::string lReply = mBuffered.substr(0, lEnd);
    mBuffered.erase(0, lEnd + 1);
    errno = 0;
    if (!lReply.starts_with("ok")) {
        sFail("\"" + lReply + "\" in reply to: " + acrLine.substr(0, 80));
    }
    return lReply.size() > 3 ? lReply.substr(3) : "";
}
