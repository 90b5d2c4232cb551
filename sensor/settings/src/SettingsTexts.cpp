#include "sensor/settings/src/SettingsTexts.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/un.h>

#include <algorithm>
#include <charconv>
#include <climits>

#include "libkpm/include/ScopeEventKinds.h"

static constexpr std::size_t scMaxName = 128;
static constexpr std::size_t scMaxQuoted = 60;
static constexpr std::size_t scMaxSocketPath = sizeof(sockaddr_un::sun_path) - 1;
static constexpr std::string_view scControlName = "/control";
static constexpr std::string_view scUnixPrefix = "unix:";
static constexpr std::string_view scConditions[] = {"deaf", "gap", "refused", "agent-down", "disk-full", "path-lost"};

static bool sIsPrintable(std::string_view aText) {
    return std::all_of(aText.begin(), aText.end(),
                       [](char aByte) { return static_cast<unsigned char>(aByte) >= ' ' && aByte != '\x7F'; });
}

static bool sIsPath(std::string_view aText) {
    return aText.starts_with('/') && aText.size() < PATH_MAX && sIsPrintable(aText);
}

static bool sIsFile(std::string_view aText) {
    return sIsPath(aText) && !aText.ends_with('/');
}

/// Without the slashes at its end.
static std::string_view sTrim(std::string_view aPath) {
    return aPath.substr(0, aPath.find_last_not_of('/') + 1);
}

static bool sIsDirectory(std::string_view aText) {
    return sIsPath(aText) && !sTrim(aText).empty();
}

static bool sIsHost(std::string_view aText) {
    static constexpr std::string_view scOthers = ".-_:[]";
    return !aText.empty() && aText.size() <= 255 && std::all_of(aText.begin(), aText.end(), [](char aByte) {
        return (aByte >= 'a' && aByte <= 'z') || (aByte >= 'A' && aByte <= 'Z') || (aByte >= '0' && aByte <= '9') ||
               scOthers.find(aByte) != std::string_view::npos;
    });
}

struct ZTSListen {
    bool mIsGood = false;
    bool mIsLoopback = false;
};

static ZTSListen sParseAddress(std::string_view aText) {
    const std::size_t lColon = aText.rfind(':');
    if (lColon == std::string_view::npos) {
        return {};
    }
    const std::string_view lPort = aText.substr(lColon + 1);
    std::uint16_t lNumber = 0;
    const auto [lpEnd, lError] = std::from_chars(lPort.data(), lPort.data() + lPort.size(), lNumber);
    if (lError != std::errc() || lpEnd != lPort.data() + lPort.size() || lNumber == 0) {
        return {};
    }
    std::string lHost(aText.substr(0, lColon));
    in_addr lAddress4{};
    if (inet_pton(AF_INET, lHost.c_str(), &lAddress4) == 1) {
        return {true, (ntohl(lAddress4.s_addr) >> 24) == 127};
    }
    in6_addr lAddress6{};
    if (lHost.starts_with('[') && lHost.ends_with(']') &&
        inet_pton(AF_INET6, lHost.substr(1, lHost.size() - 2).c_str(), &lAddress6) == 1) {
        return {true, IN6_IS_ADDR_LOOPBACK(&lAddress6) != 0};
    }
    return {lHost == "localhost", lHost == "localhost"};
}

static bool sIsListen(std::string_view aText) {
    if (aText.starts_with(scUnixPrefix)) {
        const std::string_view lPath = aText.substr(scUnixPrefix.size());
        return sIsFile(lPath) && lPath.size() <= scMaxSocketPath;
    }
    return aText.empty() || sParseAddress(aText).mIsGood;
}

bool isPublicListen(std::string_view aListen) {
    return !aListen.empty() && !aListen.starts_with(scUnixPrefix) && !sParseAddress(aListen).mIsLoopback;
}

static bool sIsWarnKind(std::string_view aText) {
    return std::find(std::begin(scConditions), std::end(scConditions), aText) != std::end(scConditions) ||
           std::any_of(gcScopeEventKinds.begin(), gcScopeEventKinds.end(),
                       [&](const ZTSScopeEventKind& acrKind) { return aText == acrKind.mpName; });
}

const ZTSTextRule gcAnyRule{sIsPrintable, "printable"};
const ZTSTextRule gcProgramRule{
    [](std::string_view aText) {
        return aText.find('/') == std::string_view::npos ? !aText.empty() && sIsPrintable(aText) : sIsFile(aText);
    },
    "a program's name without a slash, or an absolute path"};
const ZTSTextRule gcPathRule{sIsFile, "the absolute path of a file"};
const ZTSTextRule gcOptionalPathRule{[](std::string_view aText) { return aText.empty() || sIsFile(aText); },
                                     "the absolute path of a file, or empty"};
const ZTSTextRule gcStreamRule{[](std::string_view aText) { return aText.empty() || aText == "-" || sIsFile(aText); },
                               "the absolute path of a file, \"-\", or empty"};
const ZTSTextRule gcDirectoryRule{sIsDirectory, "the absolute path of a directory other than /", true};
const ZTSTextRule gcSocketDirectoryRule{
    [](std::string_view aText) {
        return sIsDirectory(aText) && sTrim(aText).size() + scControlName.size() <= scMaxSocketPath;
    },
    "the absolute path of a directory other than /, of at most 99 bytes (it holds a socket)", true};
const ZTSTextRule gcListenRule{
    sIsListen,
    "empty, unix: and an absolute path of at most 107 bytes, or an IPv4 address, an IPv6 address in "
    "brackets or localhost, a colon and a port from 1 to 65535"};
const ZTSTextRule gcHostRule{sIsHost, "a host's name of letters, digits and . - _ : [ ], of 1 to 255 bytes"};
const ZTSTextRule gcNameRule{
    [](std::string_view aText) { return !aText.empty() && aText.size() <= scMaxName && sIsPrintable(aText); },
    "a printable text of 1 to 128 bytes"};
const ZTSTextRule gcWarnKindRule{
    sIsWarnKind, "an event kind (kpm-sim kinds prints them), deaf, gap, refused, agent-down, disk-full or path-lost"};
const ZTSTextRule gcWarnPerRule{
    [](std::string_view aText) { return aText == "port" || aText == "initiator" || aText == "host"; },
    "\"port\", \"initiator\" or \"host\""};

std::string escaped(std::string_view aText) {
    static constexpr char scDigits[] = "0123456789abcdef";
    std::string lText;
    for (const char lByte : aText) {
        if (sIsPrintable({&lByte, 1})) {
            lText += lByte;
        } else {
            lText += "\\x";
            lText += scDigits[static_cast<unsigned char>(lByte) >> 4];
            lText += scDigits[lByte & 0x0F];
        }
    }
    return lText;
}

std::string quoted(std::string_view aText) {
    return '"' + escaped(aText.substr(0, scMaxQuoted)) + (aText.size() > scMaxQuoted ? "...\"" : "\"");
}
