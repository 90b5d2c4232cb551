#include <signal.h>

#include <CLI/CLI.hpp>
#include <functional>

#include "sensor/client/include/CommandLine.h"
#include "sensor/store/include/StoreErrors.h"
#include "sensor/tavik/src/Tavik.h"

/// A reader that goes away ends this process without a word, whatever the parent has made of the signal.
static void sEndWithReader() {
    signal(SIGPIPE, SIG_DFL);
    sigset_t lPipe;
    sigemptyset(&lPipe);
    sigaddset(&lPipe, SIGPIPE);
    sigprocmask(SIG_UNBLOCK, &lPipe, nullptr);
}

static void sAddPorts(CLI::App& arCommand, ZTSFilterTexts& arFilter) {
    arCommand.add_option("--port", arFilter.mPorts, "Only this remote port: WWPN or name; may be repeated")
        ->expected(1)
        ->take_all();
    arCommand
        .add_option("--initiator", arFilter.mInitiators, "Only this adapter port: WWPN, name or hostN; may be repeated")
        ->expected(1)
        ->take_all();
}

static void sAddFilter(CLI::App& arCommand, ZTSFilterTexts& arFilter) {
    arCommand.add_option("--since", arFilter.mSince, "Begin: a time, a duration back from now, or a mark");
    arCommand.add_option("--until", arFilter.mUntil, "End: a time, a duration back from now, or a mark");
    arCommand.add_option("--kind", arFilter.mKinds, "Only this kind; may be repeated")->expected(1)->take_all();
    sAddPorts(arCommand, arFilter);
}

/// Parses the line and runs its command.
static int sRun(int aCount, const char* const* appArguments) {
    ZTSTavikOptions lOptions;
    std::function<int(const ZTSTavikOptions&)> lCommand = runStatus;
    CLI::App lApp{
        "Shows what Tavik has collected from this host's Fibre Channel adapters, and the state of Tavik itself.",
        "tavik"};
    lApp.require_subcommand(0, 1);
    lApp.fallthrough();
    lApp.set_version_flag("--version", "tavik v" TAVIK_VERSION);
    lApp.add_option("--config", lOptions.mConfig,
                    "The configuration file; default: $TAVIK_CONFIG, else /etc/tavik/tavik.toml")
        ->check(refuseEmptyName);
    lApp.add_flag("--json", lOptions.mIsJson, "Print JSON instead of text");
    lApp.footer(
        "Without a command, tavik runs status.\n"
        "Exit status: 0 done, 2 wrong use or a history that a newer version has written, 3 no answer is possible,\n"
        "4 standard output cannot be written. The exit status of status: 0 collecting, 1 collecting, but deaf for a\n"
        "kind or with losses in the last 24 hours, 3 not collecting.");

    const auto lAdd = [&](const char* apName, const char* apText, int (*apRun)(const ZTSTavikOptions&)) {
        CLI::App* const lpCommand = lApp.add_subcommand(apName, apText);
        lpCommand->callback([&lCommand, apRun] { lCommand = apRun; });
        return lpCommand;
    };
    lAdd("status", "Say whether Tavik collects, and what to do if it does not", runStatus)
        ->add_flag("--watch", lOptions.mIsWatch, "Show it again every second; q quits");
    CLI::App* const lpEvents = lAdd("events", "List episodes of like events, the newest last", runEvents);
    sAddFilter(*lpEvents, lOptions.mFilter);
    lpEvents->add_option("--lun", lOptions.mFilter.mLuns, "Only this LUN, or all; may be repeated")
        ->expected(1)
        ->take_all();
    lpEvents->add_option("--limit", lOptions.mFilter.mLimit,
                         "Only the newest N; 0: all; default: 100, with --json all");
    lpEvents->add_flag("--open", lOptions.mFilter.mIsOpenOnly, "Only episodes that have not ended");
    lpEvents->add_flag("--records", lOptions.mIsRecords, "Print the raw records that are kept of the episodes");
    lpEvents->add_flag("--follow", lOptions.mIsFollow, "Go on and print new changes, until interrupted");
    sAddFilter(*lAdd("ports", "List remote ports by how many events they had", runPorts), lOptions.mFilter);
    CLI::App* const lpPaths = lAdd("paths", "List LUNs with their paths, and what is wrong with them", runPaths);
    sAddPorts(*lpPaths, lOptions.mFilter);
    lpPaths
        ->add_option("--lun", lOptions.mFilter.mLuns,
                     "This LUN: number, wwid, multipath device or disk; may be repeated")
        ->expected(1)
        ->take_all();
    lpPaths->add_option("--at", lOptions.mAt, "The paths at a time, a duration back from now, or a mark");
    lpPaths->add_flag("--trouble", lOptions.mIsTroubleOnly, "Only LUNs that lack a path");
    lpPaths->add_flag("--each", lOptions.mIsEachPath, "Print a line for each path, not only for paths with a trouble");
    CLI::App* const lpExplain = lAdd("explain", "Say what the last day meant, and what to look at next", runExplain);
    lpExplain->add_option("WHAT", lOptions.mSubject,
                          "A kind, state, trouble or rule, an episode's number, or topics, which lists them");
    lpExplain->add_option("--since", lOptions.mFilter.mSince,
                          "Begin: a time, a duration back from now, or a mark; default: 24h");
    lpExplain->add_option("--until", lOptions.mFilter.mUntil, "End: a time, a duration back from now, or a mark");
    lpExplain->add_flag("--all", lOptions.mIsAll, "Also print harmless findings");
    lAdd("check", "Report in one line for a monitoring system: 0 OK, 1 WARNING, 2 CRITICAL, 3 UNKNOWN", runCheck)
        ->add_option("--since", lOptions.mFilter.mSince, "How far back events and losses count; default: 10m");
    CLI::App* const lpMark = lAdd("mark", "Give this moment a name, for --since and --until", runMark);
    lpMark->add_option("NAME", lOptions.mMark, "The name. A mark that has it already is moved")->required();
    lpMark->add_option("--at", lOptions.mMarkTime, "Another moment: a time, or a duration back from now");
    lAdd("warn", "Run every warning's hook with a test record: 0 all succeeded, 1 one failed", runWarn)
        ->add_flag("--test", lOptions.mIsTest, "Run the hooks now");

    CLI::App* const lpDiff =
        lAdd("diff", "Show what is different between two moments: 0 nothing, 1 something", runDiff);
    lpDiff->add_option("FROM", lOptions.mFrom,
                       "A mark, a time, or a duration back from now; default: the last mark, or 24h");
    lpDiff->add_option("TO", lOptions.mTo, "A mark, a time, or a duration back from now; default: now");
    lAdd("report", "Write an archive for support", runReport)
        ->add_option("-o,--output", lOptions.mOutput, "The archive's file; default: tavik-report-HOST-TIME.tar.gz");

    if (const auto lText = parseCommandLine<ZTCWrongUseEx>(lApp, aCount, appArguments)) {
        writeOutput(*lText);
        return ZTTX_Done;
    }
    return lCommand(lOptions);
}

int main(int aCount, char** appArguments) {
    try {
        requireStandardOutput();
        sEndWithReader();
        return sRun(aCount, appArguments);
    } catch (const ZTCWrongUseEx& lrEx) {
        complain(lrEx.what());
        return ZTTX_WrongUse;
    } catch (const ZTCBadFilterEx& lrEx) {
        complain(lrEx.what());
        return ZTTX_WrongUse;
    } catch (const ZTCNotKnownEx& lrEx) {
        complain(lrEx.what());
        return ZTTX_NotKnown;
    } catch (const ZTCStoreNewerEx& lrEx) {
        complain(lrEx.what());
        return ZTTX_NewerHistory;
    } catch (const ZTCStoreEx& lrEx) {
        complain(lrEx.what());
        return ZTTX_NotKnown;
    } catch (const std::exception& lrEx) {
        complain(lrEx.what());
        return ZTTX_LocalFailure;
    }
}
