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
    {"plogi", "ElsPlogi", 1, 0x01, 1, 0x01, 20, 20, 0,
     "Not enough data in ELS PLOGI Event ", "Processing PLOGI event Cat="},
    {"prlo", "ElsPrlo", 1, 0x02, 1, 0x02, 12, 12, 0,
     "Not enough data in ELS PRLO Event ", "Processing PRLO event Cat="},
    {"adisc", "ElsAdisc", 1, 0x04, 1, 0x04, 20, 20, 0,
     "Not enough data in ELS ADISC Event ", "Processing ADISC event Cat="},
    {"lsrjt", "ElsLsrjt", 1, 0x08, 1, 0x08, 24, 24, 8,
     "Not enough data in ELS LSRJT Event ", "Processing LsRjt Event Category="},
    {"logo", "ElsLogo", 1, 0x10, 1, 0x10, 20, 20, 0,
     "Not enough data in ELS LOGO Event ", "Processing LOGO event Cat="},
    {"rscn", "ElsRscn", 0, 0x02, 1, 0x20, 8, 8, 0,
     "Not enough data in RSCN Event ", "Processing Rscn Event Cat="},
    {"fabric-busy", "FabricFbsy", 2, 0x01, 2, 0x01, 0, 4, 0,
     "", "Processing Fabric BUSY event Cat="},
    {"port-busy", "FabricPbsy", 2, 0x02, 2, 0x02, 12, 12, 0,
     "Not enough event data in FABRIC PORT BUSY event", "Processing PORTBUSY event Cat="},
    {"fcp-read-check", "FabricFcprdchkerr", 2, 0x04, 2, 0x04, 24, 24, 4,
     "Not enough data in FCPRDCHECKERR event ", "Processing FCPRDCHKERR event Cat="},
    {"queue-full", "ScsiQfull", 4, 0x01, 4, 0x01, 16, 48, 0,
     "Not enough data in SCSI Event ", "Processing QFULL event Cat="},
    {"device-busy", "ScsiDevbsy", 4, 0x02, 4, 0x02, 16, 48, 0,
     "Not enough data in SCSI Event ", "Processing DEVBSY event Cat="},
    {"check-condition", "ScsiCheckcondition", 4, 0x04, 4, 0x04, 32, 128, 0,
     "Not enough data in SCSI CHECKCOND Event ", "Processing CHECKCOND event Cat="},
    // A LUN reset that is too short is reported as a target reset.
    {"lun-reset", "ScsiLunreset", 4, 0x08, 4, 0x08, 16, 16, 4,
     "Not enough data in SCSI TGTRESET Event ", "Processing LUN RESET Cat="},
    {"target-reset", "ScsiTgtreset", 4, 0x10, 4, 0x10, 16, 16, 4,
     "Not enough data in SCSI TGTRESET Event ", "Processing TGT RESET Cat="},
    {"bus-reset", "ScsiBusreset", 4, 0x20, 4, 0x20, 0, 4, 0,
     "", "Processing BUSRESET event Cat="},
    {"queue-depth", "ScsiVarquedepth", 4, 0x40, 4, 0x40, 24, 20, 8,
     "Not enough data in SCSI VARQUEDEPTH Event ", "Processing VARQDEPTH event Cat="},
    {"port-interrupt", "BoardPortinterr", 8, 0x01, 8, 0x01, 0, 4, 0,
     "", "Processing PORTINTERR event Cat="},
    {"link", "BoardLinkatte", 0, 0x01, 8, 0x02, 0, 4, 0,
     "", "Processing LINK event Cat="},
    {"temperature", "BoardTemperature", 0, 0x20, 8, 0x04, 0, 4, 0,
     "", "Processing TEMP event Cat="},
    {"adapter-arrival", "AdapterArrival", 16, 0x01, 16, 0x01, 0, 4, 0,
     "", "Processing ADAPTER ARRIVAL Event Cat="},
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
