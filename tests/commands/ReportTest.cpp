#include <archive.h>
#include <archive_entry.h>
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <array>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <stdexcept>

#include "sensor/store/include/Store.h"
#include "sensor/topology/include/TopologyScan.h"
#include "tests/commands/TavikProgram.h"
#include "tests/unit/topology/FakeSysfs.h"

using testing::ContainsRegex;
using testing::HasSubstr;
using testing::Not;

/// The contents of an archive by their paths, without the folder that all are in.
static std::map<std::string, std::string> sReadArchive(const std::string& acrPath) {
    const std::unique_ptr<archive, int (*)(archive*)> lpArchive(archive_read_new(), &archive_read_free);
    archive_read_support_filter_gzip(lpArchive.get());
    archive_read_support_format_tar(lpArchive.get());
    if (archive_read_open_filename(lpArchive.get(), acrPath.c_str(), 65536) != ARCHIVE_OK) {
        throw std::runtime_error(archive_error_string(lpArchive.get()));
    }
    std::map<std::string, std::string> lFiles;
    for (archive_entry* lpEntry = nullptr; archive_read_next_header(lpArchive.get(), &lpEntry) == ARCHIVE_OK;) {
        const std::string lPath = archive_entry_pathname(lpEntry);
        std::string& lrText = lFiles[lPath.substr(lPath.find('/') + 1)];
        std::array<char, 65536> lBytes;
        for (la_ssize_t lCount; (lCount = archive_read_data(lpArchive.get(), lBytes.data(), lBytes.size())) > 0;) {
            lrText.append(lBytes.data(), static_cast<std::size_t>(lCount));
        }
    }
    return lFiles;
}

static constexpr const char* scHook = R"([names]
"50:06:01:60:00:00:00:09" = "array7 ctrl-A"
[[warn]]
kind = "gap"
run = ["/usr/local/bin/page-me", "--token=s3cr3t-t0k3n", "hunter2"]
# password of the pager: pa55-in-a-comment
)";
static constexpr std::array scSecrets{"s3cr3t-t0k3n", "hunter2", "pa55-in-a-comment"};

class Report : public testing::Test {
protected:
    std::map<std::string, std::string> make() {
        const ZTSTavikRun lRun = mTavik.run({"report", "-o", mTavik.path("out.tar.gz")});
        EXPECT_EQ(lRun.mExit, 0) << lRun.mError;
        EXPECT_THAT(lRun.mOutput, HasSubstr("out.tar.gz: "));
        return sReadArchive(mTavik.path("out.tar.gz"));
    }

    void fillHistory() {
        mTree.addHost(7);
        mTree.addRemotePort(7, 3, 9);
        mTree.addPath(7, 3, 12, "naa.60060160", "sdc");
        mTavik.setVariable("TAVIK_SYSFS_ROOT", mTree.roots().mSysfs);
        ZTCPatientReader lReader;
        ZTCStore lStore(mTavik.path("state"), {}, [](const std::string&) {});
        ZTCStoreTransaction lTransaction = lStore.begin();
        lStore.noteTopology(toMicroseconds(getHistoryTime()), scanTopology(mTree.roots(), lReader));
        lTransaction.commit();
    }

    ZTCTavikProgram mTavik{scHook};
    ZTCFakeSysfs mTree;
};

TEST_F(Report, HasSettingsVersionsPathsHistorySysfsAndLogs) {
    fillHistory();
    writeFile(mTavik.path("agent.log"), "the agent's last words\n");
    std::map<std::string, std::string> lFiles = make();
    EXPECT_THAT(lFiles["settings.txt"], HasSubstr("collect.period = 5000 ms\n"));
    EXPECT_THAT(lFiles["settings.txt"], HasSubstr("names.50:06:01:60:00:00:00:09 = \"array7 ctrl-A\"\n"));
    EXPECT_THAT(lFiles["settings.txt"], HasSubstr("run /usr/local/bin/page-me; arguments left out: 2\n"));
    EXPECT_THAT(lFiles["versions.txt"], ContainsRegex("tavik [0-9]"));
    EXPECT_THAT(lFiles["versions.txt"], HasSubstr("Linux"));
    EXPECT_THAT(lFiles["status.txt"], HasSubstr("NOT COLLECTING"));
    EXPECT_THAT(lFiles["check.txt"], HasSubstr("TAVIK CRITICAL"));
    EXPECT_EQ(nlohmann::json::parse(lFiles["status.json"])["schema"], "tavik.status/1");
    EXPECT_EQ(nlohmann::json::parse(lFiles["paths.json"])["luns"][0]["wwid"], "naa.60060160");
    EXPECT_TRUE(nlohmann::json::parse(lFiles["history/events.json"])["episodes"].is_array());
    EXPECT_TRUE(nlohmann::json::parse(lFiles["history/topology.json"]).is_array());
    EXPECT_EQ(lFiles["sysfs/class/fc_host/host7/port_state"], "Online\n");
    EXPECT_EQ(lFiles["sysfs/class/scsi_device/7:0:3:12/device/wwid"], "naa.60060160\n");
    EXPECT_EQ(lFiles["logs/qrv-tvk.log"], "the agent's last words\n");
}

TEST_F(Report, NoSecretOfTheConfigurationIsInIt) {
    fillHistory();
    writeFile(mTavik.path("agent.log"), "started page-me --token=s3cr3t-t0k3n hunter2\n");
    const std::map<std::string, std::string> lFiles = make();
    ASSERT_TRUE(lFiles.contains("logs/qrv-tvk.log"));
    for (const auto& [lPath, lText] : lFiles) {
        for (const char* const lpSecret : scSecrets) {
            EXPECT_THAT(lPath + "\n" + lText, Not(HasSubstr(lpSecret))) << lPath;
        }
    }
    EXPECT_EQ(lFiles.at("logs/qrv-tvk.log"), "started page-me [left out] [left out]\n");
}

TEST_F(Report, NoSecretOfTheConfigurationIsInTheMessagesOfTheService) {
    const std::string lJournal = mTavik.path("journalctl");
    writeFile(lJournal, "#!/bin/sh\necho 'page-me --token=s3cr3t-t0k3n hunter2 failed'\n");
    ASSERT_EQ(chmod(lJournal.c_str(), 0700), 0);
    mTavik.setVariable("PATH", mTavik.path("") + ":/usr/bin:/bin");
    EXPECT_EQ(make().at("logs/journal.txt"), "page-me [left out] [left out] failed\n");
}

TEST_F(Report, WhatCannotBeHadIsNamedAndTheRestIsThere) {
    mTavik.setVariable("TAVIK_SYSFS_ROOT", mTavik.path("nothing"));
    std::map<std::string, std::string> lFiles = make();
    EXPECT_THAT(lFiles["missing.txt"], HasSubstr("history: "));
    EXPECT_THAT(lFiles["missing.txt"], HasSubstr("logs/qrv-tvk.log: "));
    EXPECT_TRUE(lFiles.contains("settings.txt"));
    EXPECT_FALSE(lFiles.contains("logs/qrv-tvk.log"));
}

TEST_F(Report, AnArchiveThatCannotBeWrittenLeavesNothingBehind) {
    const ZTSTavikRun lRun = mTavik.run({"report", "-o", mTavik.path("no/such/folder/out.tar.gz")});
    EXPECT_EQ(lRun.mExit, 4);
    EXPECT_THAT(lRun.mError, HasSubstr("no/such/folder/out.tar.gz.part"));
    EXPECT_FALSE(exists(mTavik.path("no")));
}
