/// The event data of each kind as named fields, driven by one table: a row a kind, its fields, and the entries that
/// repeat in the kinds that append.
#ifndef SENSOR_CLIENT_INCLUDE_RECORDFIELDS_H
#define SENSOR_CLIENT_INCLUDE_RECORDFIELDS_H

#include <cstdint>
#include <span>
#include <string>
#include <variant>
#include <vector>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/client/include/FcName.h"

/// How a field's bytes are read, and how people see it.
enum ZTEFieldForm : std::uint8_t {
    ZTFF_Number,     ///< little-endian 32-bit, decimal
    ZTFF_Hex,        ///< the same, hexadecimal
    ZTFF_FcAddress,  ///< the same, six hexadecimal digits
    ZTFF_Lun,        ///< the same, decimal; 0xFFFFFFFF stands for every LUN
    ZTFF_Name,       ///< eight bytes of a world wide name
    ZTFF_Bits,       ///< bit field: the numbers of the bits that are set, decimal
    ZTFF_HexBits     ///< the same, hexadecimal
};

/// A number of a field that has a name of its own.
struct ZTSValueName {
    std::uint32_t mValue;
    const char* mpName;
};

struct ZTSFieldRule {
    const char* mpName;  ///< as in JSON
    std::uint32_t mOffset;
    ZTEFieldForm mForm;
    std::uint32_t mShift = 0;           ///< of a number: applied first
    std::uint32_t mMask = 0xFFFFFFFFU;  ///< of a number: applied then
    std::span<const ZTSValueName> mValueNames{};
    std::uint32_t mBitCountOffset = 0;  ///< of a bit field: where its little-endian number of bits stands

    /// Bytes of the field itself.
    constexpr std::uint32_t getSize() const {
        return mForm == ZTFF_Name ? 8 : mForm == ZTFF_Bits || mForm == ZTFF_HexBits ? 32 : 4;
    }
};

struct ZTSKindRule {
    const ZTSScopeEventKind* mpKind;
    std::span<const ZTSFieldRule> mFields;
    const char* mpEntriesName = nullptr;  ///< of an appending kind
    std::uint32_t mEntriesOffset = 0;     ///< where the first entry stands; the appended ones follow it without a gap
    std::span<const ZTSFieldRule> mEntryFields{};
};

/// The table, in catalogue order.
std::span<const ZTSKindRule> getKindRules();

/// The row of the kind that is delivered as this pair, or null.
const ZTSKindRule* findKindRule(std::uint8_t aCategory, std::uint8_t aSubcategory);

/// A field's value: a number, a name, or the numbers of the set bits in rising order.
struct ZTSFieldValue {
    const ZTSFieldRule* mpRule;
    std::variant<std::uint32_t, ZTSFcName, std::vector<std::uint32_t>> mValue;

    /// The value's own name, or null.
    const char* findValueName() const;
};

struct ZTSDecodedData {
    const ZTSScopeEventKind* mpKind = nullptr;  ///< null: unknown kind, nothing decoded
    const ZTSKindRule* mpRule = nullptr;
    std::vector<ZTSFieldValue> mFields;
    std::vector<std::vector<ZTSFieldValue>> mEntries;
    std::string mProblem;  ///< what does not fit the kind's layout; empty: all fits

    /// The field of that name, or null.
    const ZTSFieldValue* find(const char* apName) const;
};

/// Never throws, whatever the bytes are: missing fields are left out, and the problem says so.
ZTSDecodedData decodeEventData(std::uint8_t aCategory, std::uint8_t aSubcategory, std::span<const std::uint8_t> aData);

#endif
