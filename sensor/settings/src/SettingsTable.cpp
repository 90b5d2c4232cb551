#include "sensor/settings/src/SettingsTable.h"

#include <algorithm>
#include <array>
#include <limits>

static constexpr double scMostOf32Bits = std::numeric_limits<std::uint32_t>::max();

static constexpr ZTSRange sCount(double aLeast, double aMost) {
    return {ZTQ_Count, aLeast, aMost, nullptr};
}

static constexpr ZTSRange sSeconds(double aLeast, double aMost) {
    return {ZTQ_Seconds, aLeast, aMost, nullptr};
}

static constexpr ZTSRange sBytes(double aLeast, double aMost) {
    return {ZTQ_Bytes, aLeast, aMost, nullptr};
}

static constexpr ZTSRange sText(const ZTSTextRule& acrRule) {
    return {ZTQ_Count, 0, 0, &acrRule};
}

static constexpr double scMebibyte = 1024.0 * 1024;
static constexpr double scTebibyte = scMebibyte * scMebibyte;

std::span<const ZTSKey> settingsTable() {
    using S = ZTSSettings;
    static constexpr auto scKeys = std::to_array<ZTSKey>({
        {"agent", "program", &S::mAgentProgram, sText(gcProgramRule), R"("qrv-tvk")",
         "The agent's program. It is looked for beside tavik-sensor, then in the sbin folder of its\n"
         "installation, then in PATH."},
        {"agent", "library", &S::mAgentLibrary, sText(gcAnyRule), R"("")",
         "The adapters' library (ZT_LIBKPM_PATH of the agent). Empty: the agent's own default."},
        {"agent", "log", &S::mAgentLog, sText(gcPathRule), R"("/var/log/tavik/qrv-tvk.log")",
         "The agent's log, its level (the sum of: 1 halt, 2 alert, 4 critical, 8 error, 16 warning,\n"
         "32 notice, 64 info, 128 trace) and its heartbeat in whole seconds."},
        {"agent", "log_level", &S::mAgentLogLevel, sCount(0, 255), "31", ""},
        {"agent", "heartbeat", &S::mAgentHeartbeat, {ZTQ_WholeSeconds, 1, scMostOf32Bits, nullptr}, "60", ""},

        {"sensor", "directory", &S::mSensorDirectory, sText(gcSocketDirectoryRule), R"("/run/tavik")",
         "Holds agent/ (FIFOs, pid files, status pages) and the socket control. Gone after a restart of\n"
         "the host."},
        {"sensor", "state", &S::mSensorState, sText(gcDirectoryRule), R"("/var/lib/tavik")",
         "Holds the history (history.db) and the spool. Do not delete it."},

        {"collect", "period", &S::mCollectPeriod, sSeconds(0.1, 3600), "5.0",
         "How often the collector looks whether the agent holds events, and retrieves them. When many events\n"
         "come, the agent asks for an earlier look."},
        {"collect", "record_limit", &S::mCollectRecordLimit, sCount(0, scMostOf32Bits), "900",
         "Most bytes of event data in one record."},

        {"targets",
         "sysfs",
         &S::mTargetsSysfs,
         {},
         "true",
         "The sensor learns the remote ports from /sys/class/fc_remote_ports, and from a file of the form\n"
         "that \"tavikctl targets\" takes. An empty path: no file."},
        {"targets", "file", &S::mTargetsFile, sText(gcOptionalPathRule), R"("")", ""},

        {"history", "days", &S::mHistoryDays, sCount(1, 36500), "90",
         "What is older than these days is retired: counted in totals, then deleted. When the history is\n"
         "larger than this size, its oldest part is retired too."},
        {"history", "size", &S::mHistorySize, sBytes(16 * scMebibyte, 1024 * scTebibyte), R"("2GiB")", ""},
        {"history", "records", &S::mHistoryRecords, sCount(0, 1000000), "100",
         "How many raw records are kept at the beginning of an episode, and how many at its end."},

        {"episode", "gap", &S::mEpisodeGap, sSeconds(1, 86400), "60",
         "An episode ends after this time without an event."},

        {"http", "listen", &S::mHttpListen, sText(gcListenRule), R"("127.0.0.1:9632")",
         "\"ADDRESS:PORT\", \"unix:PATH\", or \"\" for off. Every local user can read a loopback port. The mode of\n"
         "a socket says who can read it. Any other address needs public = true."},
        {"http", "public", &S::mHttpPublic, {}, "false", ""},
        {"http", "hosts", &S::mHttpHosts, sText(gcHostRule), "[]",
         "Host names that are accepted in the Host header, besides localhost, 127.0.0.1 and [::1]."},

        {"metrics", "textfile", &S::mMetricsTextfile, sText(gcOptionalPathRule), R"("")",
         "A file for node_exporter's textfile collector. Empty: none."},
        {"metrics", "remote_ports", &S::mMetricsRemotePorts, sCount(0, 100000), "500",
         "At most this many remote ports get a label of their own."},

        {"ndjson", "path", &S::mNdjsonPath, sText(gcStreamRule), R"("")",
         "A file that gets one line of JSON for each change of an episode. \"-\" is standard output. Empty:\n"
         "none. The file is renamed at this size, and this many renamed files are kept."},
        {"ndjson", "size", &S::mNdjsonSize, sBytes(scMebibyte / 16, scTebibyte), R"("64MiB")", ""},
        {"ndjson", "keep", &S::mNdjsonKeep, sCount(0, 1000), "5", ""},

        {"journal",
         "enabled",
         &S::mJournalEnabled,
         {},
         "false",
         "Whether each change of an episode becomes an entry in the system's journal."},
    });
    return scKeys;
}

std::vector<std::string> changedKeys(const ZTSSettings& acrOne, const ZTSSettings& acrOther) {
    std::vector<std::string> lChanged;
    for (const ZTSKey& lcrKey : settingsTable()) {
        if (std::visit([&](auto apMember) { return acrOne.*apMember != acrOther.*apMember; }, lcrKey.mMember)) {
            lChanged.push_back(lcrKey.toText());
        }
    }
    if (acrOne.mNames != acrOther.mNames) {
        lChanged.emplace_back("names");
    }
    if (acrOne.mWarnings != acrOther.mWarnings) {
        lChanged.emplace_back("warn");
    }
    return lChanged;
}

static void sAppendComment(std::string& arText, const std::string& acrComment) {
    std::size_t lStart = 0;
    while (lStart < acrComment.size()) {
        const std::size_t lEnd = std::min(acrComment.find('\n', lStart), acrComment.size());
        arText += "# " + acrComment.substr(lStart, lEnd - lStart) + "\n";
        lStart = lEnd + 1;
    }
}

std::string defaultSettingsFile() {
    std::string lText =
        "# Settings of Tavik. Every default is here as a comment. To change one, remove its # and edit the value.\n"
        "# \"tavik-sensor --check\" reports the errors of this file and starts nothing.\n"
        "# Durations are numbers of seconds or texts such as \"90s\", \"10m\", \"24h\", \"30d\"; sizes are texts such\n"
        "# as \"64MiB\".\n";
    std::string lSection;
    for (const ZTSKey& lcrKey : settingsTable()) {
        if (lSection != lcrKey.mpSection) {
            lSection = lcrKey.mpSection;
            lText += "\n[" + lSection + "]\n";
        }
        sAppendComment(lText, lcrKey.mpMeaning);
        lText += std::string("#") + lcrKey.mpName + " = " + lcrKey.mpDefault + "\n";
    }
    lText +=
        "\n# Your names for ports and nodes, by world wide name. By default there are none.\n"
        "[names]\n"
        "# \"50:06:01:60:3b:a0:12:34\" = \"array7 ctrl-A\"\n"
        "\n# Programs (hooks) that are run when there is trouble. By default there are none, and there may be any\n"
        "# number of [[warn]] tables. The keys, with their defaults in parentheses:\n"
        "# kind: an event kind (kpm-sim kinds), or deaf, gap, refused, agent-down, disk-full, path-lost\n"
        "# count, within: the hook is run after this many events (1) within this time (60)\n"
        "# per: events are counted for each \"port\", \"initiator\" or \"host\" (\"port\")\n"
        "# run: the program and its arguments; it is run without a shell\n"
        "# timeout: after this time the hook is ended, with all processes that it has started (30)\n";
    lText +=
        "# [[warn]]\n"
        "# kind = \"queue-full\"\n"
        "# count = 100\n"
        "# within = \"5m\"\n"
        "# run = [\"/usr/local/bin/tell-someone\", \"--urgent\"]\n";
    return lText;
}
