// Bytes of two kernels' own interfaces, captured in a guest (tests/vm/captures), read by everything that reads such
// bytes. What each file is stands in the captures' README.
#include <gtest/gtest.h>

#include <cstdio>
#include <sstream>
#include <string>
#include <vector>

#include "libkpm/linux/src/Btf.h"
#include "libkpm/linux/src/FcMessage.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/SenseData.h"
#include "libkpm/linux/src/Sysfs.h"
#include "libkpm/linux/src/TraceFormat.h"
#include "libkpm/linux/src/TracePage.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/linux/KernelBytes.h"

// The guests had this byte order.
static constexpr std::endian scOrder = std::endian::little;

class Captured : public testing::TestWithParam<const char*> {
protected:
    std::string path(const std::string& acrName) const {
        return std::string(TAVIK_CAPTURES "/") + GetParam() + "/" + acrName;
    }

    ZTCBytes bytes(const std::string& acrName) const {
        const std::string lText = readFile(path(acrName));
        EXPECT_FALSE(lText.empty()) << path(acrName);
        return ZTCBytes(lText.begin(), lText.end());
    }

    bool hasSense() const { return std::string(GetParam()) != "6.1"; }

    ZTSScsiDoneLayout layout() const {
        const std::string lText = readFile(path("tracing/events/scsi/scsi_dispatch_cmd_done/format"));
        return std::get<ZTSScsiDoneLayout>(makeScsiDoneLayout(parseTraceFormat(lText)));
    }

    ZTSTracePageLayout pageLayout() const {
        return std::get<ZTSTracePageLayout>(
            makeTracePageLayout(parseTraceFormat(readFile(path("tracing/events/header_page")))));
    }

    /// "HOST:CHANNEL:ID:LUN STATUS [sense=(key=... asc=... ascq=...)]" of each finished command in the pages.
    std::vector<std::string> outcomes(const std::string& acrName) const {
        const ZTCBytes lBytes = bytes("tracing/pages/" + acrName + ".bin");
        const ZTSTracePageLayout lPageLayout = pageLayout();
        std::vector<std::string> lOutcomes;
        for (std::size_t lPlace = 0; lPlace < lBytes.size(); lPlace += lPageLayout.mPageSize) {
            ZTCTracePage lPage(ZTCByteSpan(lBytes).subspan(lPlace, lPageLayout.mPageSize), lPageLayout, scOrder);
            while (const auto lRecord = lPage.next()) {
                if (getTraceRecordId(*lRecord, layout(), scOrder) != layout().mId) {
                    continue;
                }
                const auto lOutcome = parseScsiOutcome(*lRecord, layout(), scOrder);
                if (!lOutcome) {
                    ADD_FAILURE() << "a record that does not parse";
                    continue;
                }
                char lText[128];
                std::snprintf(lText, sizeof lText, "%u:%u:%u:%u %02x", lOutcome->mHost, lOutcome->mChannel,
                              lOutcome->mTarget, lOutcome->mLun, lOutcome->mStatus);
                lOutcomes.emplace_back(lText);
                EXPECT_EQ(lOutcome->mSenseKey == gcUnknownSense, !hasSense());
                if (hasSense()) {
                    std::snprintf(lText, sizeof lText, " sense=(key=%s%x asc=%s%x ascq=%s%x)", "0x",
                                  lOutcome->mSenseKey, "0x", lOutcome->mAsc, "0x", lOutcome->mAscq);
                    lOutcomes.back() += lText;
                }
            }
            EXPECT_FALSE(lPage.isMalformed()) << acrName << " at " << lPlace;
        }
        return lOutcomes;
    }

    /// The same from the kernel's own text.
    std::vector<std::string> texts(const std::string& acrName) const {
        static constexpr std::pair<const char*, const char*> scStatuses[] = {{"GOOD", "00"},
                                                                             {"CHECK_CONDITION", "02"},
                                                                             {"BUSY", "08"},
                                                                             {"TASK_SET_FULL", "28"},
                                                                             {"RESERVATION_CONFLICT", "18"}};
        std::vector<std::string> lTexts;
        std::istringstream lLines(readFile(path("tracing/pages/" + acrName + ".txt")));
        for (std::string lLine; std::getline(lLines, lLine);) {
            const std::size_t lPlace = lLine.find("scsi_dispatch_cmd_done: ");
            if (lPlace == std::string::npos) {
                continue;
            }
            unsigned lHost = 0;
            unsigned lChannel = 0;
            unsigned lTarget = 0;
            unsigned lLun = 0;
            EXPECT_EQ(std::sscanf(lLine.c_str() + lPlace, "scsi_dispatch_cmd_done: host_no=%u channel=%u id=%u lun=%u",
                                  &lHost, &lChannel, &lTarget, &lLun),
                      4);
            std::string lText = std::to_string(lHost) + ":" + std::to_string(lChannel) + ":" + std::to_string(lTarget) +
                                ":" + std::to_string(lLun) + " ";
            for (const auto& [lpName, lpCode] : scStatuses) {
                if (lLine.find(std::string("status=SAM_STAT_") + lpName + ")") != std::string::npos) {
                    lText += lpCode;
                }
            }
            const std::size_t lSense = lLine.find(" sense=(");
            lTexts.push_back(lText + (lSense == std::string::npos ? "" : lLine.substr(lSense)));
        }
        return lTexts;
    }
};

TEST_P(Captured, FcMessagesAreReadAsTheyWerePosted) {
    struct Row {
        const char* mpName;
        std::uint32_t mCode;
        std::size_t mDataBytes;
    };
    const Row lRows[] = {{"lip", 4, 4},
                         {"link-down", 4, 4},
                         {"link-down-2", 4, 4},
                         {"post-link-up", 2, 4},
                         {"post-link-down", 3, 4},
                         {"post-rscn-port", 5, 4},
                         {"post-rscn-fabric", 5, 4},
                         {"post-adapter-change", 0x103, 4},
                         {"post-port-offline", 0x201, 4},
                         {"post-no-data", 5, 0},
                         {"forged", 3, 4}};
    for (const Row& lrRow : lRows) {
        SCOPED_TRACE(lrRow.mpName);
        const ZTCBytes lBytes = bytes(std::string("netlink/") + lrRow.mpName + ".bin");
        ZTCLinuxFcMessages lMessages(lBytes, scOrder);
        const auto lEvent = lMessages.next();
        ASSERT_TRUE(lEvent.has_value());
        EXPECT_EQ(lEvent->mCode, lrRow.mCode);
        EXPECT_EQ(lEvent->mData.size(), lrRow.mDataBytes);
        EXPECT_LE(lEvent->mHost, 1u);
        EXPECT_FALSE(lMessages.next().has_value());
        EXPECT_EQ(lMessages.getMalformed(), 0u);
    }
}

TEST_P(Captured, LongerAndForeignKindsOfMessagesAreNotMalformed) {
    for (const char* lpName : {"post-fpin", "post-vendor"}) {
        const ZTCBytes lBytes = bytes(std::string("netlink/") + lpName + ".bin");
        ZTCLinuxFcMessages lMessages(lBytes, scOrder);
        while (const auto lEvent = lMessages.next()) {
            EXPECT_GE(lEvent->mCode, 0x500u) << lpName;
        }
        EXPECT_EQ(lMessages.getMalformed(), 0u) << lpName;
    }
}

TEST_P(Captured, RscnsAreMadeAsOnTheWire) {
    const auto lPayload = [this](const char* apName) {
        const ZTCBytes lBytes = bytes(std::string("netlink/") + apName + ".bin");
        return makeLinuxRscn(ZTCLinuxFcMessages(lBytes, scOrder).next().value().mData, scOrder);
    };
    EXPECT_EQ(lPayload("post-rscn-port"), (ZTCBytes{0x61, 4, 0, 8, 0, 1, 2, 3}));
    EXPECT_FALSE(lPayload("post-no-data").has_value()) << "an RSCN without a page";
    EXPECT_EQ(lPayload("post-rscn-fabric"), (ZTCBytes{0x61, 4, 0, 8, 3, 0, 0, 0}));
}

TEST_P(Captured, DescriptionsAreRead) {
    EXPECT_EQ(layout().hasSense(), hasSense());
    EXPECT_EQ(std::to_string(layout().mId) + "\n", readFile(path("tracing/events/scsi/scsi_dispatch_cmd_done/id")));
    EXPECT_EQ(layout().mResult.mOffset, 24u);
    EXPECT_EQ(pageLayout().mPageSize, 4096u);
}

TEST_P(Captured, PagesAreReadAsTheKernelsOwnTextTells) {
    for (const char* lpName :
         {"busy", "check-conditions", "queue-full", "reservation-conflict", "start-and-done", "disrupted", "timeout"}) {
        EXPECT_EQ(outcomes(lpName), texts(lpName)) << lpName;
    }
    EXPECT_EQ(texts("check-conditions").size(), 4u);
    EXPECT_TRUE(texts("timeout").empty()) << "a command that is not finished is no outcome";
}

TEST_P(Captured, AnOverrunIsMarkedOnItsFirstPageAndTheRestIsRead) {
    const ZTCBytes lBytes = bytes("tracing/pages/overrun.bin");
    EXPECT_TRUE(ZTCTracePage(ZTCByteSpan(lBytes).first(4096), pageLayout(), scOrder).hasLossBefore());
    EXPECT_FALSE(ZTCTracePage(ZTCByteSpan(lBytes).last(4096), pageLayout(), scOrder).hasLossBefore());
    const std::vector<std::string> lOutcomes = outcomes("overrun");
    const std::vector<std::string> lTexts = texts("overrun");
    ASSERT_GT(lOutcomes.size(), lTexts.size());
    EXPECT_EQ(
        std::vector<std::string>(lOutcomes.begin(), lOutcomes.begin() + static_cast<std::ptrdiff_t>(lTexts.size())),
        lTexts);
}

TEST_P(Captured, HostsAndRemotePortsAreFoundInSysfs) {
    const ZTCSysfs lSysfs(path("sysfs-online"));
    const std::vector<ZTSLinuxHost> lHosts = lSysfs.readHosts().value();
    ASSERT_EQ(lHosts.size(), 2u);
    EXPECT_TRUE(isSameName(lHosts[0].mPortName, HBA_wwn{{0x20, 0, 2, 0, 0, 0, 0, 1}}));
    EXPECT_TRUE(isSameName(lHosts[1].mPortName, HBA_wwn{{0x20, 0, 2, 0, 0, 0, 0, 2}}));
    for (std::uint32_t lHost = 0; lHost < 2; ++lHost) {
        EXPECT_EQ(lSysfs.readPortState(lHost), ZTLK_Up);
        EXPECT_EQ(lSysfs.readPortId(lHost), lHost + 1);
        EXPECT_EQ(ZTCSysfs(path("sysfs-linkdown")).readPortState(lHost), ZTLK_Down);
        EXPECT_EQ(ZTCSysfs(path("sysfs-linkdown")).readPortId(lHost), 0u);
    }
    ZTCLinuxRemotePorts lPorts(lSysfs);
    EXPECT_TRUE(isSameName(lPorts.find(0, 0, 0), lHosts[1].mPortName)) << "the target behind host 1";
    EXPECT_TRUE(isZeroName(lPorts.find(1, 0, 0))) << "host 1 sees no target";
}

TEST_P(Captured, TheProbeForSenseDataHasTheOffsetsOfTheKernel) {
    const ZTCBytes lKernel = bytes("btf/vmlinux");
    const ZTCBytes lModule = bytes("btf/scsi_mod");
    const auto lLine = makeSenseProbe(ZTCBtf(lKernel, lModule), "group", "$arg1");
    ASSERT_TRUE(std::holds_alternative<std::string>(lLine)) << std::get<ZTSTraceProblem>(lLine).mText;
    const std::string lTags = hasSense() ? "driver_tag=-216($arg1):s32 scheduler_tag=-212($arg1):s32"
                                         : "driver_tag=-240($arg1):s32 scheduler_tag=-236($arg1):s32";
    EXPECT_EQ(std::get<std::string>(lLine),
              "p:group/check_sense scsi_check_sense host=+404(+0(+0($arg1))):u32 channel=+148(+0($arg1)):u32 "
              "id=+144(+0($arg1)):u32 lun=+152(+0($arg1)):u64 result=+288($arg1):u32 opcode=+164($arg1):x8 " +
                  lTags + " sense=+0(+248($arg1)):x8[20]");
}

INSTANTIATE_TEST_SUITE_P(Kernels, Captured, testing::Values("6.1", "6.12"), [](const auto& acrInfo) {
    return std::string(acrInfo.param) == "6.1" ? "Of6Dot1" : "Of6Dot12";
});
