/// The tests' own table of the twenty event kinds. It is written down independently of the agent's tables, which the
/// tests check against it. Tables that need more of a kind (its data, its record, its JSON) build on these rows.
#ifndef TESTS_SUPPORT_EVENTKINDS_H
#define TESTS_SUPPORT_EVENTKINDS_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>

struct ZTSTestKind {
    const char* mpName;       ///< as tools print it
    const char* mpClassName;  ///< the part of its class's name that is its own
    std::uint8_t mRegisteredCategory;
    std::uint8_t mRegisteredSubcategory;
    std::uint8_t mCategory;  ///< as delivered
    std::uint8_t mSubcategory;
    std::size_t mMinimumLength;  ///< bytes of data that the agent needs to consolidate an event; 0: none
    std::size_t mRecordSize;     ///< bytes of the record that such an event makes
    std::size_t mAppendedSize;   ///< bytes that a further event of the same identity appends
    const char* mpTooShort;      ///< message about too few bytes, up to its two numbers; empty where there is none
    const char* mpNotice;        ///< notice about an event that is processed, up to its category

    /// The whole notice.
    std::string notice() const {
        return mpNotice + std::to_string(mCategory) + " SubCat=" + std::to_string(mSubcategory);
    }

    /// The whole message about an event with so many bytes of data.
    std::string tooShort(std::size_t aLength) const {
        return mpTooShort + std::to_string(mMinimumLength) + " " + std::to_string(aLength);
    }
};

// clang-format off
/// In catalogue order.
inline constexpr std::array<ZTSTestKind, 20> gcTestKinds{{
    {.mpName = "plogi", .mpClassName = "ElsPlogi",
     .mRegisteredCategory = 1, .mRegisteredSubcategory = 0x01, .mCategory = 1, .mSubcategory = 0x01,
     .mMinimumLength = 20, .mRecordSize = 20, .mAppendedSize = 0,
     .mpTooShort = "Not enough data in ELS PLOGI Event ",
     .mpNotice = "Processing PLOGI event Cat="},
    {.mpName = "prlo", .mpClassName = "ElsPrlo",
     .mRegisteredCategory = 1, .mRegisteredSubcategory = 0x02, .mCategory = 1, .mSubcategory = 0x02,
     .mMinimumLength = 12, .mRecordSize = 12, .mAppendedSize = 0,
     .mpTooShort = "Not enough data in ELS PRLO Event ",
     .mpNotice = "Processing PRLO event Cat="},
    {.mpName = "adisc", .mpClassName = "ElsAdisc",
     .mRegisteredCategory = 1, .mRegisteredSubcategory = 0x04, .mCategory = 1, .mSubcategory = 0x04,
     .mMinimumLength = 20, .mRecordSize = 20, .mAppendedSize = 0,
     .mpTooShort = "Not enough data in ELS ADISC Event ",
     .mpNotice = "Processing ADISC event Cat="},
    {.mpName = "lsrjt", .mpClassName = "ElsLsrjt",
     .mRegisteredCategory = 1, .mRegisteredSubcategory = 0x08, .mCategory = 1, .mSubcategory = 0x08,
     .mMinimumLength = 24, .mRecordSize = 24, .mAppendedSize = 8,
     .mpTooShort = "Not enough data in ELS LSRJT Event ",
     .mpNotice = "Processing LsRjt Event Category="},
    {.mpName = "logo", .mpClassName = "ElsLogo",
     .mRegisteredCategory = 1, .mRegisteredSubcategory = 0x10, .mCategory = 1, .mSubcategory = 0x10,
     .mMinimumLength = 20, .mRecordSize = 20, .mAppendedSize = 0,
     .mpTooShort = "Not enough data in ELS LOGO Event ",
     .mpNotice = "Processing LOGO event Cat="},
    {.mpName = "rscn", .mpClassName = "ElsRscn",
     .mRegisteredCategory = 0, .mRegisteredSubcategory = 0x02, .mCategory = 1, .mSubcategory = 0x20,
     .mMinimumLength = 8, .mRecordSize = 8, .mAppendedSize = 0,
     .mpTooShort = "Not enough data in RSCN Event ",
     .mpNotice = "Processing Rscn Event Cat="},
    {.mpName = "fabric-busy", .mpClassName = "FabricFbsy",
     .mRegisteredCategory = 2, .mRegisteredSubcategory = 0x01, .mCategory = 2, .mSubcategory = 0x01,
     .mMinimumLength = 0, .mRecordSize = 4, .mAppendedSize = 0,
     .mpTooShort = "",
     .mpNotice = "Processing Fabric BUSY event Cat="},
    {.mpName = "port-busy", .mpClassName = "FabricPbsy",
     .mRegisteredCategory = 2, .mRegisteredSubcategory = 0x02, .mCategory = 2, .mSubcategory = 0x02,
     .mMinimumLength = 12, .mRecordSize = 12, .mAppendedSize = 0,
     .mpTooShort = "Not enough event data in FABRIC PORT BUSY event",
     .mpNotice = "Processing PORTBUSY event Cat="},
    {.mpName = "fcp-read-check", .mpClassName = "FabricFcprdchkerr",
     .mRegisteredCategory = 2, .mRegisteredSubcategory = 0x04, .mCategory = 2, .mSubcategory = 0x04,
     .mMinimumLength = 24, .mRecordSize = 24, .mAppendedSize = 4,
     .mpTooShort = "Not enough data in FCPRDCHECKERR event ",
     .mpNotice = "Processing FCPRDCHKERR event Cat="},
    {.mpName = "queue-full", .mpClassName = "ScsiQfull",
     .mRegisteredCategory = 4, .mRegisteredSubcategory = 0x01, .mCategory = 4, .mSubcategory = 0x01,
     .mMinimumLength = 16, .mRecordSize = 48, .mAppendedSize = 0,
     .mpTooShort = "Not enough data in SCSI Event ",
     .mpNotice = "Processing QFULL event Cat="},
    {.mpName = "device-busy", .mpClassName = "ScsiDevbsy",
     .mRegisteredCategory = 4, .mRegisteredSubcategory = 0x02, .mCategory = 4, .mSubcategory = 0x02,
     .mMinimumLength = 16, .mRecordSize = 48, .mAppendedSize = 0,
     .mpTooShort = "Not enough data in SCSI Event ",
     .mpNotice = "Processing DEVBSY event Cat="},
    {.mpName = "check-condition", .mpClassName = "ScsiCheckcondition",
     .mRegisteredCategory = 4, .mRegisteredSubcategory = 0x04, .mCategory = 4, .mSubcategory = 0x04,
     .mMinimumLength = 32, .mRecordSize = 128, .mAppendedSize = 0,
     .mpTooShort = "Not enough data in SCSI CHECKCOND Event ",
     .mpNotice = "Processing CHECKCOND event Cat="},
    // A LUN reset that is too short is reported as a target reset.
    {.mpName = "lun-reset", .mpClassName = "ScsiLunreset",
     .mRegisteredCategory = 4, .mRegisteredSubcategory = 0x08, .mCategory = 4, .mSubcategory = 0x08,
     .mMinimumLength = 16, .mRecordSize = 16, .mAppendedSize = 4,
     .mpTooShort = "Not enough data in SCSI TGTRESET Event ",
     .mpNotice = "Processing LUN RESET Cat="},
    {.mpName = "target-reset", .mpClassName = "ScsiTgtreset",
     .mRegisteredCategory = 4, .mRegisteredSubcategory = 0x10, .mCategory = 4, .mSubcategory = 0x10,
     .mMinimumLength = 16, .mRecordSize = 16, .mAppendedSize = 4,
     .mpTooShort = "Not enough data in SCSI TGTRESET Event ",
     .mpNotice = "Processing TGT RESET Cat="},
    {.mpName = "bus-reset", .mpClassName = "ScsiBusreset",
     .mRegisteredCategory = 4, .mRegisteredSubcategory = 0x20, .mCategory = 4, .mSubcategory = 0x20,
     .mMinimumLength = 0, .mRecordSize = 4, .mAppendedSize = 0,
     .mpTooShort = "",
     .mpNotice = "Processing BUSRESET event Cat="},
    {.mpName = "queue-depth", .mpClassName = "ScsiVarquedepth",
     .mRegisteredCategory = 4, .mRegisteredSubcategory = 0x40, .mCategory = 4, .mSubcategory = 0x40,
     .mMinimumLength = 24, .mRecordSize = 20, .mAppendedSize = 8,
     .mpTooShort = "Not enough data in SCSI VARQUEDEPTH Event ",
     .mpNotice = "Processing VARQDEPTH event Cat="},
    {.mpName = "port-interrupt", .mpClassName = "BoardPortinterr",
     .mRegisteredCategory = 8, .mRegisteredSubcategory = 0x01, .mCategory = 8, .mSubcategory = 0x01,
     .mMinimumLength = 0, .mRecordSize = 4, .mAppendedSize = 0,
     .mpTooShort = "",
     .mpNotice = "Processing PORTINTERR event Cat="},
    {.mpName = "link", .mpClassName = "BoardLinkatte",
     .mRegisteredCategory = 0, .mRegisteredSubcategory = 0x01, .mCategory = 8, .mSubcategory = 0x02,
     .mMinimumLength = 0, .mRecordSize = 4, .mAppendedSize = 0,
     .mpTooShort = "",
     .mpNotice = "Processing LINK event Cat="},
    {.mpName = "temperature", .mpClassName = "BoardTemperature",
     .mRegisteredCategory = 0, .mRegisteredSubcategory = 0x20, .mCategory = 8, .mSubcategory = 0x04,
     .mMinimumLength = 0, .mRecordSize = 4, .mAppendedSize = 0,
     .mpTooShort = "",
     .mpNotice = "Processing TEMP event Cat="},
    {.mpName = "adapter-arrival", .mpClassName = "AdapterArrival",
     .mRegisteredCategory = 16, .mRegisteredSubcategory = 0x01, .mCategory = 16, .mSubcategory = 0x01,
     .mMinimumLength = 0, .mRecordSize = 4, .mAppendedSize = 0,
     .mpTooShort = "",
     .mpNotice = "Processing ADAPTER ARRIVAL Event Cat="},
}};
// clang-format on

/// The row of this name. Throws std::runtime_error where there is none.
inline const ZTSTestKind& testKind(std::string_view aName) {
    for (const ZTSTestKind& lcrKind : gcTestKinds) {
        if (lcrKind.mpName == aName) {
            return lcrKind;
        }
    }
    throw std::runtime_error("no such kind: " + std::string(aName));
}

#endif
