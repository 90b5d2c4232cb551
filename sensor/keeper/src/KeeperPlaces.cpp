#include "sensor/keeper/include/KeeperPlaces.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <vector>

#include "sensor/client/include/ClientErrors.h"

static constexpr int scFifoSize = 1048576;
static constexpr int scBacklog = 16;
static constexpr const char* scCollectorName = "tavik-collector";

std::string ownFolder() {
    std::error_code lError;
    const std::filesystem::path lProgram = std::filesystem::read_symlink("/proc/self/exe", lError);
    if (lError) {
        throw ZTCSystemCallEx("cannot find out where this program is", lError.value());
    }
    return lProgram.parent_path();
}

static bool sIsProgram(const std::string& acrPath) {
    struct stat lStatus {};
    return stat(acrPath.c_str(), &lStatus) == 0 && S_ISREG(lStatus.st_mode) && (lStatus.st_mode & 0111) != 0;
}

static std::string sFindIn(const std::vector<std::string>& acrFolders, const std::string& acrName) {
    std::string lPlaces;
    for (const std::string& lcrFolder : acrFolders) {
        std::string lPath = lcrFolder + "/" + acrName;
        if (sIsProgram(lPath)) {
            return lPath;
        }
        lPlaces += (lPlaces.empty() ? "" : ", ") + lcrFolder;
    }
    throw ZTCBadInputEx("no program " + acrName + " in " + lPlaces);
}

std::string findAgentProgram(const std::string& acrProgram, const std::string& acrOwnFolder) {
    if (acrProgram.find('/') != std::string::npos) {
        return acrProgram;
    }
    std::vector<std::string> lFolders{acrOwnFolder, acrOwnFolder + "/../sbin"};
    const char* lpPath = std::getenv("PATH");
    const std::string lPath = lpPath != nullptr ? lpPath : "";
    for (std::size_t lStart = 0; lStart < lPath.size();) {
        const std::size_t lEnd = std::min(lPath.find(':', lStart), lPath.size());
        if (lPath[lStart] == '/') {  // an empty or relative folder would depend on where the keeper was started
            lFolders.push_back(lPath.substr(lStart, lEnd - lStart));
        }
        lStart = lEnd + 1;
    }
    return sFindIn(lFolders, acrProgram);
}

std::string findCollectorProgram(const std::string& acrOwnFolder) {
    return sFindIn({acrOwnFolder, acrOwnFolder + "/../libexec/tavik"}, scCollectorName);
}

/// Makes the folder with exactly this mode, whatever the umask is. Returns false, with errno, where that fails.
static bool sTryFolder(const std::string& acrPath, mode_t aMode) {
    const mode_t lMask = umask(0);
    const bool lIsMade = mkdir(acrPath.c_str(), aMode) == 0;
    const int lErrno = errno;
    umask(lMask);
    errno = lErrno;
    return lIsMade;
}

/// Where it is missing; the folders above it too.
static void sMakeFolder(const std::string& acrPath, mode_t aMode) {
    bool lIsThere = sTryFolder(acrPath, aMode);
    if (!lIsThere && errno == ENOENT) {
        sMakeFolder(std::filesystem::path(acrPath).parent_path(), 0755);
        lIsThere = sTryFolder(acrPath, aMode);
    }
    if (!lIsThere && errno != EEXIST) {
        throw ZTCSystemCallEx("cannot make the directory " + acrPath, errno);
    }
}

void makeDirectories(const ZTSSettings& acrSettings) {
    sMakeFolder(acrSettings.mSensorDirectory, 0755);
    sMakeFolder(acrSettings.mSensorState, 0750);
    const std::string lAgent = acrSettings.agentDirectory();
    sMakeFolder(lAgent, 0700);
    const ZTCFileDescriptor lFolder = ZTCFileDescriptor::open(lAgent.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW);
    struct stat lStatus {};
    if (!lFolder.isOpen() || fstat(lFolder.get(), &lStatus) != 0) {
        throw ZTCSystemCallEx("cannot use the directory " + lAgent, errno);
    }
    if (lStatus.st_uid != geteuid()) {
        throw ZTCBadInputEx(lAgent + " belongs to user " + std::to_string(lStatus.st_uid) + ", must belong to user " +
                            std::to_string(geteuid()) + ", who runs the sensor");
    }
    if (fchmod(lFolder.get(), 0700) != 0) {
        throw ZTCSystemCallEx("cannot set the mode of " + lAgent, errno);
    }
}

ZTCFileDescriptor openControlSocket(const std::string& acrPath) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    if (acrPath.size() >= sizeof(lAddress.sun_path)) {
        throw ZTCBadInputEx(acrPath + " is too long for a socket: at most 107 bytes");
    }
    std::memcpy(lAddress.sun_path, acrPath.c_str(), acrPath.size());
    ZTCFileDescriptor lSocket(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!lSocket.isOpen() || (unlink(acrPath.c_str()) != 0 && errno != ENOENT)) {
        throw ZTCSystemCallEx("cannot make the socket " + acrPath, errno);
    }
    const mode_t lMask = umask(0117);  // from the first moment on nobody else may connect
    const bool lIsBound = bind(lSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)) == 0;
    const int lErrno = errno;
    umask(lMask);
    if (!lIsBound || listen(lSocket.get(), scBacklog) != 0) {
        throw ZTCSystemCallEx("cannot make the socket " + acrPath, lIsBound ? errno : lErrno);
    }
    return lSocket;
}

ZTCFileDescriptor makeResponseFifo(const std::string& acrPath) {
    if ((unlink(acrPath.c_str()) != 0 && errno != ENOENT) || mkfifo(acrPath.c_str(), 0600) != 0) {
        throw ZTCSystemCallEx("cannot make the FIFO " + acrPath, errno);
    }
    ZTCFileDescriptor lFifo = ZTCFileDescriptor::open(acrPath.c_str(), O_RDONLY | O_NONBLOCK | O_NOFOLLOW);
    if (!lFifo.isOpen()) {
        throw ZTCSystemCallEx("cannot open the FIFO " + acrPath, errno);
    }
    fcntl(lFifo.get(), F_SETPIPE_SZ, scFifoSize);  // smaller where the user's pipes have reached their limit
    return lFifo;
}

std::set<std::string> listHostNames() {
    const char* lpRoot = std::getenv("TAVIK_SYSFS_ROOT");
    std::set<std::string> lNames;
    std::error_code lError;
    for (std::filesystem::directory_iterator lEntry(std::string(lpRoot != nullptr ? lpRoot : "/sys") + "/class/fc_host",
                                                    lError);
         !lError && lEntry != std::filesystem::directory_iterator(); lEntry.increment(lError)) {
        lNames.insert(lEntry->path().filename());
    }
    return lNames;
}

ZTCFileDescriptor makeTextFile(const std::string& acrText) {
    ZTCFileDescriptor lFile(memfd_create("tavik-settings", MFD_CLOEXEC));
    std::size_t lWritten = 0;
    while (lFile.isOpen() && lWritten < acrText.size()) {
        const ssize_t lCount = write(lFile.get(), acrText.data() + lWritten, acrText.size() - lWritten);
        if (lCount < 0 && errno != EINTR) {
            lFile.reset();
        }
        lWritten += static_cast<std::size_t>(lCount > 0 ? lCount : 0);
    }
    if (!lFile.isOpen()) {
        throw ZTCSystemCallEx("cannot keep the text of the settings", errno);
    }
    return lFile;
}
