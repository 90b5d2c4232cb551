#include "libkpm/linux/src/SenseData.h"

#include <algorithm>
#include <array>
#include <string_view>

// As much of the sense data as has the key and both codes in either format.
static constexpr std::size_t scSenseBytes = 20;

ZTSSenseValues parseSense(ZTCByteSpan aSense) {
    const auto lByte = [&](std::size_t aPlace) -> std::uint32_t {
        return aPlace < aSense.size() ? aSense[aPlace] : 0u;
    };
    switch (lByte(0) & 0x7F) {
        case 0x70:
        case 0x71: {
            // Byte 7 has the number of bytes behind it.
            const std::uint32_t lEnd = lByte(7) + 8;
            return {lByte(2) & 0xF, lEnd > 12 ? lByte(12) : 0, lEnd > 13 ? lByte(13) : 0};
        }
        case 0x72:
        case 0x73:
            return {lByte(1) & 0xF, lByte(2), lByte(3)};
        default:
            return {};
    }
}

// ---- The probe ----

/// The structures and members that the probe goes through, as the kernel names them.
struct ZTSScsiMembers {
    std::optional<ZTSBtfStructure> mCommand;
    std::optional<ZTSBtfStructure> mDevice;
    std::optional<ZTSBtfStructure> mHost;
    std::optional<ZTSBtfStructure> mRequest;
};

static ZTSScsiMembers sFindMembers(const ZTCBtf& acrBtf) {
    static constexpr std::array<std::string_view, 4> scCommand{"device", "cmnd", "result", "sense_buffer"};
    static constexpr std::array<std::string_view, 4> scDevice{"host", "id", "channel", "lun"};
    static constexpr std::array<std::string_view, 1> scHost{"host_no"};
    static constexpr std::array<std::string_view, 2> scRequest{"tag", "internal_tag"};
    return {acrBtf.find("scsi_cmnd", scCommand), acrBtf.find("scsi_device", scDevice), acrBtf.find("Scsi_Host", scHost),
            acrBtf.find("request", scRequest)};
}

/// "+8(BASE)"
static std::string sAt(std::ptrdiff_t aOffset, const std::string& acrBase) {
    return (aOffset < 0 ? "-" : "+") + std::to_string(aOffset < 0 ? -aOffset : aOffset) + "(" + acrBase + ")";
}

static std::string sAt(const ZTSBtfMember& acrMember, const std::string& acrBase) {
    return sAt(static_cast<std::ptrdiff_t>(acrMember.mOffset), acrBase);
}

/// " NAME=+8(BASE):u32"
static std::string sNumber(const char* apName, const ZTSBtfMember& acrMember, const std::string& acrBase) {
    return std::string(" ") + apName + "=" + sAt(acrMember, acrBase) + ":u" + std::to_string(8 * acrMember.mSize);
}

/// The address of a member's bytes: of the array itself, or where the pointer leads.
static std::string sBytes(const ZTSBtfMember& acrMember, const std::string& acrBase) {
    return acrMember.mForm == ZTBF_Array ? sAt(acrMember, acrBase) : sAt(0, sAt(acrMember, acrBase));
}

static bool sAreOfForm(const std::vector<ZTSBtfMember>& acrMembers, std::initializer_list<ZTEBtfForm> aForms) {
    return std::equal(acrMembers.begin(), acrMembers.end(), aForms.begin(), aForms.end(),
                      [](const ZTSBtfMember& acrMember, ZTEBtfForm aForm) {
                          const bool lIsSize = acrMember.mSize == 1 || acrMember.mSize == 2 || acrMember.mSize == 4 ||
                                               acrMember.mSize == 8;
                          const bool lIsBytes = acrMember.mForm == ZTBF_Array || acrMember.mForm == ZTBF_Pointer;
                          // Bytes are asked for as an array, and may be behind a pointer.
                          return aForm == ZTBF_Array ? lIsBytes
                                                     : acrMember.mForm == aForm && (aForm != ZTBF_Number || lIsSize);
                      });
}

std::variant<std::string, ZTSTraceProblem> makeSenseProbe(const ZTCBtf& acrBtf, const std::string& acrGroup,
                                                          const std::string& acrArgument) {
    if (!acrBtf.isWhole()) {
        return ZTSTraceProblem{"the kernel's description of its types (BTF) does not parse"};
    }
    const ZTSScsiMembers lFound = sFindMembers(acrBtf);
    if (!lFound.mCommand || !lFound.mDevice || !lFound.mHost || !lFound.mRequest) {
        const char* const lpName = !lFound.mCommand  ? "scsi_cmnd"
                                   : !lFound.mDevice ? "scsi_device"
                                   : !lFound.mHost   ? "Scsi_Host"
                                                     : "request";
        return ZTSTraceProblem{std::string("the kernel's description of its types (BTF) has no structure ") + lpName +
                               " with the members that are needed"};
    }
    const std::vector<ZTSBtfMember>& lrCommand = lFound.mCommand->mMembers;
    const std::vector<ZTSBtfMember>& lrDevice = lFound.mDevice->mMembers;
    const std::vector<ZTSBtfMember>& lrRequest = lFound.mRequest->mMembers;
    if (!sAreOfForm(lrCommand, {ZTBF_Pointer, ZTBF_Array, ZTBF_Number, ZTBF_Array}) ||
        !sAreOfForm(lrDevice, {ZTBF_Pointer, ZTBF_Number, ZTBF_Number, ZTBF_Number}) ||
        !sAreOfForm(lFound.mHost->mMembers, {ZTBF_Number}) || !sAreOfForm(lrRequest, {ZTBF_Number, ZTBF_Number})) {
        return ZTSTraceProblem{
            "the kernel's description of its types (BTF) has a member of another form than expected"};
    }
    const std::string lDevice = sAt(lrCommand[0], acrArgument);
    const std::string lHost = sAt(lrDevice[0], lDevice);
    const auto lSize = static_cast<std::ptrdiff_t>(lFound.mRequest->mSize);
    std::string lLine = "p:" + acrGroup + "/" + gcSenseEvent + " scsi_check_sense";
    lLine += sNumber("host", lFound.mHost->mMembers[0], lHost);
    lLine += sNumber("channel", lrDevice[2], lDevice);
    lLine += sNumber("id", lrDevice[1], lDevice);
    lLine += sNumber("lun", lrDevice[3], lDevice);
    lLine += sNumber("result", lrCommand[2], acrArgument);
    lLine += " opcode=" + sBytes(lrCommand[1], acrArgument) + ":x8";
    // The request is right in front of the command.
    lLine += " driver_tag=" + sAt(static_cast<std::ptrdiff_t>(lrRequest[0].mOffset) - lSize, acrArgument) + ":s32";
    lLine += " scheduler_tag=" + sAt(static_cast<std::ptrdiff_t>(lrRequest[1].mOffset) - lSize, acrArgument) + ":s32";
    lLine += " sense=" + sBytes(lrCommand[3], acrArgument) + ":x8[" + std::to_string(scSenseBytes) + "]";
    return lLine;
}

std::string makeSenseFilter(const std::vector<std::uint32_t>& acrHosts) {
    const std::string lFilter = makeHostFilter("host", acrHosts);
    return lFilter.size() < gcScsiFilterLimit ? lFilter : "0";
}

// ---- Its records ----

std::variant<ZTSSenseLayout, ZTSTraceProblem> makeSenseLayout(const ZTSTraceFormat& acrFormat) {
    ZTSSenseLayout lLayout;
    const ZTSTraceField* lpSense = acrFormat.find("sense");
    if (!acrFormat.mId || lpSense == nullptr || lpSense->mSize < scSenseBytes) {
        return ZTSTraceProblem{!acrFormat.mId ? "the format has no ID" : "the format has no field sense of 20 bytes"};
    }
    lLayout.mId = *acrFormat.mId;
    lLayout.mSense = {lpSense->mOffset, scSenseBytes};
    const ZTSTraceFieldRow lRows[] = {{"host", &lLayout.mHost, true},
                                      {"channel", &lLayout.mChannel, true},
                                      {"id", &lLayout.mTarget, true},
                                      {"lun", &lLayout.mLun, true},
                                      {"opcode", &lLayout.mOpcode, true},
                                      {"driver_tag", &lLayout.mDriverTag, true},
                                      {"scheduler_tag", &lLayout.mSchedulerTag, true}};
    if (std::optional<ZTSTraceProblem> lProblem = fillTracePlaces(acrFormat, lRows)) {
        return std::move(*lProblem);
    }
    return lLayout;
}

std::optional<ZTSSenseRecord> parseSenseRecord(ZTCByteSpan aRecord, const ZTSSenseLayout& acrLayout,
                                               std::endian aOrder) {
    bool lIsWhole = acrLayout.mSense.mOffset <= aRecord.size() &&
                    acrLayout.mSense.mSize <= aRecord.size() - acrLayout.mSense.mOffset;
    const auto lRead = [&](const ZTSTraceFieldPlace& acrPlace) {
        const std::optional<std::uint64_t> lValue = loadUnsigned(aRecord, acrPlace.mOffset, acrPlace.mSize, aOrder);
        lIsWhole = lIsWhole && lValue.has_value();
        return static_cast<std::uint32_t>(lValue.value_or(0));
    };
    ZTSSenseRecord lRecord;
    lRecord.mCommand.mHost = lRead(acrLayout.mHost);
    lRecord.mCommand.mChannel = lRead(acrLayout.mChannel);
    lRecord.mCommand.mTarget = lRead(acrLayout.mTarget);
    lRecord.mCommand.mLun = lRead(acrLayout.mLun);
    lRecord.mCommand.mOpcode = static_cast<std::uint8_t>(lRead(acrLayout.mOpcode));
    lRecord.mCommand.mDriverTag = lRead(acrLayout.mDriverTag);
    lRecord.mCommand.mSchedulerTag = lRead(acrLayout.mSchedulerTag);
    if (!lIsWhole) {
        return std::nullopt;
    }
    lRecord.mValues = parseSense(aRecord.subspan(acrLayout.mSense.mOffset, acrLayout.mSense.mSize));
    return lRecord;
}
