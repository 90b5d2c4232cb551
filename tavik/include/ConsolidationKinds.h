/// The table of the event kinds that carry data: the payload, the part of it that makes a record, the fields in which
/// two records differ, and how a record continues when the next event matches it.
#ifndef TAVIK_INCLUDE_CONSOLIDATIONKINDS_H
#define TAVIK_INCLUDE_CONSOLIDATIONKINDS_H

#include <cstdint>

/// What a matching event does to the pending record.
enum ZTEContinuation : std::uint8_t {
    ZTCN_Count,   ///< only counts
    ZTCN_Append,  ///< appends a few bytes, and counts, while there is room; else starts a new record
    ZTCN_SetBits  ///< sets bits in place, and counts
};

/// A field of the payload that is copied into a record. 8 bytes are a world wide name, 4 bytes an
/// integer.
struct ZTSFieldCopy {
    std::uint16_t mPayloadOffset;
    std::uint16_t mRecordOffset;
    std::uint16_t mSize;  ///< 0 ends the list
};

/// A number of the payload that is noted as one bit of a 256-bit field, whose length word comes before it.
struct ZTSBitFieldCopy {
    std::uint16_t mPayloadOffset;
    std::uint16_t mLengthOffset;
    std::uint16_t mFieldOffset;  ///< 0 ends the list
    bool mHasAll;                ///< 0xFFFFFFFF sets every bit; other numbers from 256 on never set one
};

inline constexpr unsigned gcMaxIdentityNames = 2;
inline constexpr unsigned gcMaxIdentityNumbers = 2;
inline constexpr unsigned gcMaxRecordDataSize = 128;
inline constexpr unsigned gcMaxAppendedSize = 8;

/// Bytes of every bit field.
inline constexpr unsigned gcBitFieldSize = 32;

/// The offset of the remote port's name in every payload.
inline constexpr unsigned gcRemotePortOffset = 4;

struct ZTSConsolidationKind {
    unsigned int mMinimumLength;  ///< bytes of the payload
    ZTEContinuation mContinuation;

    /// Payload offsets of what is compared with the previous event; 0 ends each list. The remote port is always the
    /// first.
    std::uint16_t mIdentityNames[gcMaxIdentityNames + 1];
    std::uint16_t mIdentityNumbers[gcMaxIdentityNumbers + 1];

    unsigned int mRecordSize;
    ZTSFieldCopy mRecordFields[5];
    unsigned int mAppendedSize;
    ZTSFieldCopy mAppendedFields[3];
    ZTSBitFieldCopy mBitFields[4];
};

extern const ZTSConsolidationKind gcPlogiKind;
extern const ZTSConsolidationKind gcPrloKind;
extern const ZTSConsolidationKind gcAdiscKind;
extern const ZTSConsolidationKind gcLsRjtKind;
extern const ZTSConsolidationKind gcLogoKind;
extern const ZTSConsolidationKind gcPortBusyKind;
extern const ZTSConsolidationKind gcFcprdChkErrKind;
extern const ZTSConsolidationKind gcQFullKind;
extern const ZTSConsolidationKind gcDevBsyKind;
extern const ZTSConsolidationKind gcCheckCondKind;
extern const ZTSConsolidationKind gcLunResetKind;
extern const ZTSConsolidationKind gcTargetResetKind;
extern const ZTSConsolidationKind gcVarQDepthKind;

#endif
