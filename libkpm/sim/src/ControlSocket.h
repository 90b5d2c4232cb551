/// The Unix stream socket of a running library. Each line that a client sends gets one line as its answer.
#ifndef LIBKPM_SIM_SRC_CONTROLSOCKET_H
#define LIBKPM_SIM_SRC_CONTROLSOCKET_H

#include <sys/stat.h>
#include <sys/un.h>

#include <functional>
#include <list>
#include <string>
#include <string_view>
#include <thread>

#include "libkpm/common/include/Descriptor.h"

/// Fills in the address of a socket's path. Throws std::runtime_error for a path that is empty or too long for it.
sockaddr_un makeSimSocketAddress(const std::string& acrPath);

/// Serves any number of clients, one line at a time, on one thread of its own.
class ZTCSimControlSocket {
public:
    using Answer = std::function<std::string(std::string_view aLine)>;

    /// Makes the socket, of mode 0600, and starts to serve. A socket that nobody listens on is taken over; one that is
    /// served, and a path that is not a socket, is refused. Throws std::runtime_error with the path and the reason.
    ZTCSimControlSocket(std::string aPath, Answer aAnswer);

    /// Ends the service after the line that is being answered, and removes the socket if it is still this one.
    ~ZTCSimControlSocket();
    ZTCSimControlSocket(const ZTCSimControlSocket&) = delete;
    ZTCSimControlSocket& operator=(const ZTCSimControlSocket&) = delete;

private:
    struct Client {
        ZTCLibraryDescriptor mSocket;
        std::string mIn;
        std::string mOut;
        bool mIsAtEnd = false;  ///< nothing more is read from it
    };

    void removeStale() const;
    void listenOn(const sockaddr_un& acrAddress);
    void serve();
    bool acceptClient();
    bool serveClient(Client& arClient) const;
    static void receive(Client& arClient);
    void answerLine(Client& arClient) const;
    static bool send(Client& arClient);

    const std::string mPath;
    const Answer mAnswer;
    ZTCLibraryDescriptor mQuit;
    ZTCLibraryDescriptor mListener;
    struct stat mIdentity {};
    std::list<Client> mClients;  ///< of the serving thread
    std::thread mThread;
};

#endif
