#include "tests/unit/commands/FakeSensor.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <stdexcept>

ZTCFakeSensor::ZTCFakeSensor(const std::string& acrSocketPath, ZTCAnswer aAnswer)
    : mAnswer(std::move(aAnswer)),
      mListener(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)),
      mStop(eventfd(0, EFD_CLOEXEC)) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    acrSocketPath.copy(lAddress.sun_path, sizeof(lAddress.sun_path) - 1);
    unlink(acrSocketPath.c_str());
    if (bind(mListener.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)) != 0 ||
        listen(mListener.get(), 8) != 0) {
        throw std::runtime_error("cannot listen on " + acrSocketPath);
    }
    mThread.emplace([this] { serve(); });
}

ZTCFakeSensor::~ZTCFakeSensor() {
    const std::uint64_t lOne = 1;
    [[maybe_unused]] const ssize_t lWritten = write(mStop.get(), &lOne, sizeof(lOne));
    mThread->join();
}

ZTCFakeSensor::ZTCAnswer ZTCFakeSensor::withState(const nlohmann::json& acrLive) {
    return [acrLive](const nlohmann::json& acrRequest) {
        return (acrRequest.value("request", "") == "status" ? acrLive : nlohmann::json{{"error", "no such request"}})
                   .dump() +
               "\n";
    };
}

void ZTCFakeSensor::serve() {
    for (;;) {
        std::array<pollfd, 2> lSources{{{.fd = mListener.get(), .events = POLLIN, .revents = 0},
                                        {.fd = mStop.get(), .events = POLLIN, .revents = 0}}};
        poll(lSources.data(), lSources.size(), -1);
        if (lSources[1].revents != 0) {
            return;
        }
        const ZTCFileDescriptor lClient(accept4(mListener.get(), nullptr, nullptr, SOCK_CLOEXEC));
        if (lClient.isOpen()) {
            serveClient(lClient.get());
        }
    }
}

/// One request, then until the client has gone.
void ZTCFakeSensor::serveClient(int aClient) {
    std::string lLine;
    std::array<char, 4096> lBytes;
    for (;;) {
        std::array<pollfd, 2> lSources{
            {{.fd = aClient, .events = POLLIN, .revents = 0}, {.fd = mStop.get(), .events = POLLIN, .revents = 0}}};
        poll(lSources.data(), lSources.size(), -1);
        const ssize_t lCount = lSources[1].revents != 0 ? 0 : read(aClient, lBytes.data(), lBytes.size());
        if (lCount <= 0) {
            return;
        }
        lLine.append(lBytes.data(), static_cast<std::size_t>(lCount));
        if (lLine.ends_with('\n')) {
            const std::string lAnswer = mAnswer(nlohmann::json::parse(lLine));
            if (!lAnswer.empty()) {
                [[maybe_unused]] const ssize_t lSent = send(aClient, lAnswer.data(), lAnswer.size(), MSG_NOSIGNAL);
                return;
            }
        }
    }
}

nlohmann::json makeLiveState() {
    return {{"schema", "tavik.live/1"},
            {"keeper", {{"state", "running"}}},
            {"agent", {{"running", true}, {"heldBytes", 0}, {"limitBytes", 262144}}},
            {"collector", {{"disk", "ok"}}},
            {"adapters", {{{"wwpn", "10:00:00:00:c9:00:00:01"}, {"host", "host7"}}}},
            {"kinds",
             {{{"initiator", {{"wwpn", "10:00:00:00:c9:00:00:01"}, {"host", "host7"}}},
               {"kinds", {{"rscn", "listening"}, {"link", "listening"}}}}}},
            {"losses", {{"refused", nlohmann::json::object()}, {"dropped", 0}}}};
}
