#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "sensor/settings/include/Settings.h"
#include "sensor/settings/src/SettingsTable.h"

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

static std::vector<std::string> sErrors(const std::string& acrText) {
    std::vector<std::string> lTexts;
    for (const ZTSSettingsProblem& lcrError : parseSettings(acrText, "t.toml").mErrors) {
        lTexts.push_back(lcrError.toText());
    }
    return lTexts;
}

struct ZTSBadValue {
    const char* mpKey;
    const char* mpValue;
    const char* mpProblem;  ///< what follows the key
};

class SettingsError : public testing::TestWithParam<ZTSBadValue> {};

TEST_P(SettingsError, NamesFileLineKeyWhatIsWrongTheValueAndTheRange) {
    const ZTSBadValue& lcrCase = GetParam();
    const std::string lKey = lcrCase.mpKey;
    EXPECT_THAT(sErrors("\n" + lKey + " = " + lcrCase.mpValue + "\n"),
                ElementsAre("t.toml:2: " + lKey + ": " + lcrCase.mpProblem));
}

INSTANTIATE_TEST_SUITE_P(
    OutOfRange, SettingsError,
    testing::Values(
        ZTSBadValue{"agent.program", "\"\"",
                    "not usable: \"\", must be a program's name without a slash, or an absolute path"},
        ZTSBadValue{"agent.program", "\"bin/x\"",
                    "not usable: \"bin/x\", must be a program's name without a slash, or an absolute path"},
        ZTSBadValue{"agent.library", "\"a\\u0001\"", "not usable: \"a\\x01\", must be printable"},
        ZTSBadValue{"agent.log", "\"\"", "not usable: \"\", must be the absolute path of a file"},
        ZTSBadValue{"agent.log", "\"/var/\"", "not usable: \"/var/\", must be the absolute path of a file"},
        ZTSBadValue{"agent.log_level", "256", "out of range: 256, must be a whole number from 0 to 255"},
        ZTSBadValue{"agent.log_level", "-1", "out of range: -1, must be a whole number from 0 to 255"},
        ZTSBadValue{"agent.heartbeat", "0",
                    "out of range: 0, must be whole seconds, or a text such as \"90s\", from 1 to 4294967295 s"},
        ZTSBadValue{"agent.heartbeat", "1.5",
                    "a fraction of a second: 1.5, must be whole seconds, or a text such as \"90s\", from 1 to "
                    "4294967295 s"},
        ZTSBadValue{"sensor.directory", "\"run\"",
                    "not usable: \"run\", must be the absolute path of a directory other than /, of at most 99 bytes "
                    "(it holds a socket)"},
        ZTSBadValue{"sensor.state", "\"//\"",
                    "not usable: \"//\", must be the absolute path of a directory other than /"},
        ZTSBadValue{"collect.period", "0.05",
                    "out of range: 0.05, must be seconds, or a text such as \"90s\", from 0.1 to 3600 s"},
        ZTSBadValue{"collect.period", "nan",
                    "out of range: nan, must be seconds, or a text such as \"90s\", from 0.1 to 3600 s"},
        ZTSBadValue{"collect.period", "\"2h\"",
                    "out of range: \"2h\", must be seconds, or a text such as \"90s\", from 0.1 to 3600 s"},
        ZTSBadValue{"collect.period", "\"40000d\"",
                    "out of range: \"40000d\", must be seconds, or a text such as \"90s\", from 0.1 to 3600 s"},
        ZTSBadValue{"collect.period", "\"soon\"",
                    "not a duration: \"soon\", must be seconds, or a text such as \"90s\", from 0.1 to 3600 s"},
        ZTSBadValue{"collect.record_limit", "4294967296",
                    "out of range: 4294967296, must be a whole number from 0 to 4294967295"},
        ZTSBadValue{"targets.file", "\"t\"", "not usable: \"t\", must be the absolute path of a file, or empty"},
        ZTSBadValue{"history.days", "0", "out of range: 0, must be a whole number from 1 to 36500"},
        ZTSBadValue{"history.size", "\"1MiB\"",
                    "out of range: \"1MiB\", must be a size such as \"64MiB\", from 16MiB to 1024TiB"},
        ZTSBadValue{"history.size", "\"2048TiB\"",
                    "out of range: \"2048TiB\", must be a size such as \"64MiB\", from 16MiB to 1024TiB"},
        ZTSBadValue{"history.size", "\"2GB\"",
                    "not a size: \"2GB\", must be a size such as \"64MiB\", from 16MiB to 1024TiB"},
        ZTSBadValue{"history.records", "-5", "out of range: -5, must be a whole number from 0 to 1000000"},
        ZTSBadValue{"episode.gap", "0",
                    "out of range: 0, must be seconds, or a text such as \"90s\", from 1 to 86400 s"},
        ZTSBadValue{"metrics.textfile", "\"m\"", "not usable: \"m\", must be the absolute path of a file, or empty"},
        ZTSBadValue{"metrics.remote_ports", "100001", "out of range: 100001, must be a whole number from 0 to 100000"},
        ZTSBadValue{"ndjson.path", "\"n\"", "not usable: \"n\", must be the absolute path of a file, \"-\", or empty"},
        ZTSBadValue{"ndjson.size", "1", "out of range: 1, must be a size such as \"64MiB\", from 64KiB to 1TiB"},
        ZTSBadValue{"ndjson.keep", "1001", "out of range: 1001, must be a whole number from 0 to 1000"}));

INSTANTIATE_TEST_SUITE_P(
    WrongType, SettingsError,
    testing::Values(
        ZTSBadValue{"agent.log_level", "\"31\"", "wrong type: \"31\", must be a whole number from 0 to 255"},
        ZTSBadValue{"agent.log_level", "1.0", "wrong type: 1.0, must be a whole number from 0 to 255"},
        ZTSBadValue{"collect.period", "true",
                    "wrong type: true, must be seconds, or a text such as \"90s\", from 0.1 to 3600 s"},
        ZTSBadValue{"targets.sysfs", "1", "wrong type: 1, must be true or false"},
        ZTSBadValue{"journal.enabled", "\"yes\"", "wrong type: \"yes\", must be true or false"},
        ZTSBadValue{"http.public", "[]", "wrong type: a list, must be true or false"},
        ZTSBadValue{
            "http.hosts", "\"a\"",
            "wrong type: \"a\", must be a list of texts, each a host's name of letters, digits and . - _ : [ ], "
            "of 1 to 255 bytes"},
        ZTSBadValue{"http.hosts", "[\"a\", 5]",
                    "an element is not usable: 5, must be a list of texts, each a text: a host's name of letters, "
                    "digits and . - _ : [ ], of 1 to 255 bytes"},
        ZTSBadValue{"sensor.state", "2026-11-21",
                    "wrong type: a date or time, must be a text: the absolute path of a directory other than /"},
        ZTSBadValue{"agent", "5", "wrong type: 5, must be a table: [agent]"},
        ZTSBadValue{"names", "[]", "wrong type: a list, must be a table: [names]"},
        ZTSBadValue{"warn", "{kind = \"deaf\"}", "wrong type: a table, must be tables: [[warn]]"}));

TEST(SettingsErrors, EachKeyIsCheckedForItsTypeAndItsRange) {
    std::size_t lRanges = 0;
    for (const ZTSKey& lcrKey : settingsTable()) {
        const std::string lKey = lcrKey.toText();
        SCOPED_TRACE(lKey);
        EXPECT_THAT(sErrors(lKey + " = {}\n"),
                    ElementsAre(StartsWith("t.toml:1: " + lKey + ": wrong type: a table, must ")));
        const std::string lDefault = std::string(lKey) + " = " + lcrKey.mpDefault + "\n";
        EXPECT_THAT(sErrors(lDefault), testing::IsEmpty());
        if (lcrKey.mRange.mMost == 0) {
            continue;
        }
        ++lRanges;
        for (const double lValue : {lcrKey.mRange.mLeast - 1, 2 * lcrKey.mRange.mMost}) {
            const std::string lNumber = std::to_string(static_cast<long long>(lValue));
            EXPECT_THAT(sErrors(lKey + " = " + lNumber + "\n"),
                        ElementsAre(StartsWith("t.toml:1: " + lKey + ": out of range: " + lNumber + ", must be ")));
        }
    }
    EXPECT_GT(lRanges, 8U);
}

TEST(SettingsErrors, AnUnknownKeyIsNamedWithThoseThatThereAre) {
    EXPECT_THAT(sErrors("[collect]\n\nperoid = 5\n"),
                ElementsAre("t.toml:3: collect.peroid: unknown key: 5, must be one of collect.period, "
                            "collect.record_limit"));
    EXPECT_THAT(sErrors("loose = 5\n"),
                ElementsAre(StartsWith("t.toml:1: loose: unknown key: 5, must be one of [agent], "
                                       "[sensor], [collect]")));
    EXPECT_THAT(sErrors("[Agent]\n"), ElementsAre(StartsWith("t.toml:1: Agent: unknown key: a table")));
}

TEST(SettingsErrors, AllOfAFileAreReportedInTheOrderOfItsLines) {
    EXPECT_THAT(sErrors("[journal]\nenabled = 3\n[agent]\nlog_level = 999\nx = 1\n[[warn]]\nrun = [\"a\"]\n"),
                ElementsAre(StartsWith("t.toml:2: journal.enabled: wrong type"),
                            StartsWith("t.toml:4: agent.log_level: out of range"),
                            StartsWith("t.toml:5: agent.x: unknown key"), StartsWith("t.toml:6: warn.kind: missing")));
}

TEST(SettingsErrors, ABrokenFileIsNamedWithTheLineAndTheReason) {
    EXPECT_THAT(sErrors("[agent]\nlog_level = \n"), ElementsAre(StartsWith("t.toml:2: syntax: ")));
    EXPECT_THAT(sErrors("[agent\n"), ElementsAre(StartsWith("t.toml:1: syntax: ")));
    EXPECT_THAT(sErrors("a = 1\na = 2\n"), ElementsAre(StartsWith("t.toml:2: syntax: ")));
    EXPECT_THAT(sErrors("a = \"\xFF\"\n"), ElementsAre(StartsWith("t.toml:1: syntax: ")));
}

TEST(SettingsErrors, ALineBreakThatTheParserMetIsEscapedSoThatAnErrorStaysOneLine) {
    EXPECT_THAT(sErrors("a = t\nb = 1\n"),
                ElementsAre(AllOf(StartsWith("t.toml:1: syntax: "), HasSubstr("\\x0a"), Not(HasSubstr("\n")))));
}

TEST(SettingsErrors, ACharacterBeyondAsciiIsRefusedOutsideOfQuotesAndCommentsAlone) {
    const char* const lpRefused =
        "t.toml:3: syntax: a character beyond ASCII that is neither in quotes nor in a comment";
    for (const char* lpBare : {"é = 1", "[agent\xEF\xBB\xBB]", "log = \"\" Ж", R"(x = 'a\' あ)", R"(x = """"a"""" é)",
                               "x = \"a\né\"", "\xEF\xBB\xBF"}) {
        const std::string lText = std::string("\n") + (std::string(lpBare).find('\n') == std::string::npos ? "\n" : "");
        EXPECT_THAT(sErrors(lText + lpBare + "\n"), ElementsAre(lpRefused)) << lpBare;
    }
    EXPECT_THAT(sErrors("\xEF\xBB\xBF# é \"\n"
                        R"([names]
"50:06:01:60:3b:a0:12:34" = "caf\"é" # é
"50:06:01:60:3b:a0:12:35" = 'é'
"50:06:01:60:3b:a0:12:36" = '''é'"é''' # é
"50:06:01:60:3b:a0:12:37" = """é\"""é""""
)"),
                ElementsAre());
}

TEST(SettingsErrors, ListenAddressesThatCannotBeUsed) {
    for (const char* lpListen : {"9632", "127.0.0.1", "127.0.0.1:0", "127.0.0.1:65536", "127.0.0.1:x", "::1:80",
                                 "db07:80", "unix:", "unix:run/x", ":80"}) {
        EXPECT_THAT(sErrors("http.listen = \"" + std::string(lpListen) + "\"\n"),
                    ElementsAre(StartsWith("t.toml:1: http.listen: not usable: \"" + std::string(lpListen) + "\"")));
    }
    EXPECT_THAT(sErrors("http.listen = \"unix:/" + std::string(107, 'x') + "\"\n"),
                ElementsAre(HasSubstr("at most 107 bytes")));
}

TEST(SettingsErrors, AnAddressThatOtherHostsReachNeedsPermission) {
    for (const char* lpListen : {"0.0.0.0:80", "192.0.2.1:80", "[::]:80"}) {
        EXPECT_THAT(sErrors("[http]\nlisten = \"" + std::string(lpListen) + "\"\n"),
                    ElementsAre("t.toml:2: http.listen: reachable from other hosts: \"" + std::string(lpListen) +
                                "\", must be a loopback address or unix:PATH unless http.public = true"));
    }
}

TEST(SettingsErrors, NamesNeedAWorldWideNameAndAPrintableText) {
    EXPECT_THAT(sErrors("[names]\n\"50:06\" = \"a\"\n"),
                ElementsAre("t.toml:2: names.\"50:06\": not a world wide name: \"50:06\", must be 8 hex pairs with "
                            "colons, such as 50:06:01:60:3b:a0:12:34"));
    EXPECT_THAT(sErrors("[names]\n\"50:06:01:60:3b:a0:12:34\" = \"\"\n"),
                ElementsAre("t.toml:2: names.\"50:06:01:60:3b:a0:12:34\": not usable: \"\", must be a printable text "
                            "of 1 to 128 bytes"));
    EXPECT_THAT(sErrors("[names]\n\"50:06:01:60:3b:a0:12:34\" = \"a\"\n500601603BA01234 = \"b\"\n"),
                ElementsAre(HasSubstr("named twice")));
}

TEST(SettingsErrors, AWarningIsCheckedKeyByKey) {
    const std::string lHead = "[[warn]]\nkind = \"deaf\"\nrun = [\"a\"]\n";
    for (const char* lpLine : {"count = 0", "count = \"x\"", "within = 0", "timeout = 0", "timeout = \"2h\"",
                               "per = \"lun\"", "color = 1"}) {
        const std::string lLine = lpLine;
        EXPECT_THAT(sErrors(lHead + lLine + "\n"),
                    ElementsAre(StartsWith("t.toml:4: warn." + lLine.substr(0, lLine.find(' ')) + ": ")));
    }
    EXPECT_THAT(sErrors("[[warn]]\nkind = \"flood\"\nrun = [\"a\"]\n"),
                ElementsAre(StartsWith("t.toml:2: warn.kind: not usable: \"flood\", must be an event kind")));
    const std::pair<const char*, const char*> lRuns[] = {{"run = []", "3: warn.run: names no program: an empty list,"},
                                                         {"run = [\"\"]", "3: warn.run: names no program: \"\","},
                                                         {"run = [\"b/c\"]", "3: warn.run: names no program: \"b/c\","},
                                                         {"", "1: warn.run: names no program: no value,"}};
    for (const auto& [lpRun, lpProblem] : lRuns) {
        EXPECT_THAT(sErrors("[[warn]]\nkind = \"deaf\"\n" + std::string(lpRun) + "\n"),
                    ElementsAre(StartsWith("t.toml:" + std::string(lpProblem))));
    }
    EXPECT_THAT(sErrors("[[warn]]\nkind = \"deaf\"\nrun = [\"a\",\n 5]\n"),
                ElementsAre(StartsWith("t.toml:4: warn.run: an element is not usable: 5, must be a list of texts")));
    EXPECT_THAT(sErrors("[[warn]]\nkind = \"deaf\"\nrun = \"a\"\n"),
                ElementsAre(StartsWith("t.toml:3: warn.run: wrong type")));
}

TEST(SettingsErrors, TheLongestDirectoryThatHoldsASocketIsTakenAndNoLonger) {
    EXPECT_TRUE(sErrors("sensor.directory = \"/" + std::string(98, 'x') + "\"\n").empty());
    EXPECT_TRUE(sErrors("sensor.directory = \"/" + std::string(98, 'x') + "/\"\n").empty());
    EXPECT_EQ(sErrors("sensor.directory = \"/" + std::string(99, 'x') + "\"\n").size(), 1U);
}
