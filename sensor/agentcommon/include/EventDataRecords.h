/// The event data of scope records, byte for byte: written by the agent, read by the sensor.
///
/// Every 32-bit field is little-endian whatever the host; world wide names are as on the wire. All structures are
/// packed by their own types (no padding, alignment 1), so that they may be read and written at any address. A record
/// of an appending kind starts with its first structure and goes on with any number of its `TavikCons...` structures.
#ifndef SENSOR_AGENTCOMMON_INCLUDE_EVENTDATARECORDS_H
#define SENSOR_AGENTCOMMON_INCLUDE_EVENTDATARECORDS_H

#include <cstddef>
#include <cstdint>

inline constexpr std::uint32_t EVENTDATA_VERSION = 1;

/// Bytes of the bit fields; bit n lives in byte n / 8 at position n mod 8, counted from the least significant bit.
inline constexpr std::uint32_t SIZE_QFULL_OSLUN_BITFIELD = 32;
inline constexpr std::uint32_t SIZE_DEVBSY_OSLUN_BITFIELD = 32;
inline constexpr std::uint32_t SIZE_CHECKCOND_OSLUN_BITFIELD = 32;
inline constexpr std::uint32_t SIZE_CHECKCOND_CMDCODE_BITFIELD = 32;
inline constexpr std::uint32_t SIZE_CHECKCOND_ASCQ_BITFIELD = 32;

/// An unsigned 32-bit integer in little-endian bytes. get() reads it on any host.
struct ZTSLittleEndian32 {
    unsigned char mBytes[4];

    constexpr std::uint32_t get() const {
        return static_cast<std::uint32_t>(mBytes[0]) | static_cast<std::uint32_t>(mBytes[1]) << 8 |
               static_cast<std::uint32_t>(mBytes[2]) << 16 | static_cast<std::uint32_t>(mBytes[3]) << 24;
    }
};

/// The eight bytes of a world wide name.
using ZTSWwnBytes = unsigned char[8];

struct TavikGeneric {  // fabric busy, bus reset, port interrupt error, link attention, temperature, adapter arrival
    ZTSLittleEndian32 Version;
};

struct TavikPlogi {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSWwnBytes PayloadWwpn;  ///< the remote port's node name
};

struct TavikPrlo {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
};

struct TavikAdisc {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSWwnBytes Wwnn;
};

struct TavikLogo {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSWwnBytes PayloadWwpn;
};

struct TavikPortBusy {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
};

struct TavikLsRjt {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSLittleEndian32 OrgCmd;
    ZTSLittleEndian32 ReasonCode;
    ZTSLittleEndian32 ReasonCodeExpl;
};

struct TavikConsLsRjt {
    ZTSLittleEndian32 ReasonCode;
    ZTSLittleEndian32 ReasonCodeExpl;
};

struct TavikFcprdChkErr {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSLittleEndian32 OpCode;
    ZTSLittleEndian32 OsLun;
    ZTSLittleEndian32 FcpiParam;
};

struct TavikConsFcprdChkErr {
    ZTSLittleEndian32 FcpiParam;
};

struct TavikLunReset {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSLittleEndian32 OsLun;
};

struct TavikConsLunReset {
    ZTSLittleEndian32 OsLun;
};

struct TavikTargetReset {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSLittleEndian32 OsLun;
};

struct TavikConsTargetReset {
    ZTSLittleEndian32 OsLun;
};

struct TavikQChange {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSLittleEndian32 OsLun;
    ZTSLittleEndian32 NewVal;
};

struct TavikConsQChange {
    ZTSLittleEndian32 OsLun;
    ZTSLittleEndian32 NewVal;
};

struct TavikQFull {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSLittleEndian32 LenOsLun;  ///< bits of OsLun: 256
    unsigned char OsLun[SIZE_QFULL_OSLUN_BITFIELD];
};

struct TavikDevBsy {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSLittleEndian32 LenOsLun;  ///< bits of OsLun: 256
    unsigned char OsLun[SIZE_DEVBSY_OSLUN_BITFIELD];
};

struct TavikCheckCond {
    ZTSLittleEndian32 Version;
    ZTSWwnBytes Wwpn;
    ZTSLittleEndian32 SensKey;
    ZTSLittleEndian32 Asc;
    ZTSLittleEndian32 OsLunLen;  ///< bits of OsLun: 256
    unsigned char OsLun[SIZE_CHECKCOND_OSLUN_BITFIELD];
    ZTSLittleEndian32 CmdCodeLen;  ///< bits of CmdCode: 256
    unsigned char CmdCode[SIZE_CHECKCOND_CMDCODE_BITFIELD];
    ZTSLittleEndian32 AscqLen;  ///< bits of Ascq: 256
    unsigned char Ascq[SIZE_CHECKCOND_ASCQ_BITFIELD];
};

struct TavikRscn {
    ZTSLittleEndian32 Version;
    ZTSLittleEndian32 FcId;  ///< the page word: address format in bits 24 and 25, FC address in bits 0 to 23
};

static_assert(sizeof(TavikGeneric) == 4 && alignof(TavikGeneric) == 1);
static_assert(sizeof(TavikPlogi) == 20 && offsetof(TavikPlogi, Wwpn) == 4 && offsetof(TavikPlogi, PayloadWwpn) == 12);
static_assert(sizeof(TavikPrlo) == 12 && offsetof(TavikPrlo, Wwpn) == 4);
static_assert(sizeof(TavikAdisc) == 20 && offsetof(TavikAdisc, Wwpn) == 4 && offsetof(TavikAdisc, Wwnn) == 12);
static_assert(sizeof(TavikLogo) == 20 && offsetof(TavikLogo, Wwpn) == 4 && offsetof(TavikLogo, PayloadWwpn) == 12);
static_assert(sizeof(TavikPortBusy) == 12 && offsetof(TavikPortBusy, Wwpn) == 4);
static_assert(sizeof(TavikLsRjt) == 24 && offsetof(TavikLsRjt, Wwpn) == 4 && offsetof(TavikLsRjt, OrgCmd) == 12 &&
              offsetof(TavikLsRjt, ReasonCode) == 16 && offsetof(TavikLsRjt, ReasonCodeExpl) == 20);
static_assert(sizeof(TavikConsLsRjt) == 8 && offsetof(TavikConsLsRjt, ReasonCodeExpl) == 4);
static_assert(sizeof(TavikFcprdChkErr) == 24 && offsetof(TavikFcprdChkErr, Wwpn) == 4 &&
              offsetof(TavikFcprdChkErr, OpCode) == 12 && offsetof(TavikFcprdChkErr, OsLun) == 16 &&
              offsetof(TavikFcprdChkErr, FcpiParam) == 20);
static_assert(sizeof(TavikConsFcprdChkErr) == 4);
static_assert(sizeof(TavikLunReset) == 16 && offsetof(TavikLunReset, Wwpn) == 4 &&
              offsetof(TavikLunReset, OsLun) == 12);
static_assert(sizeof(TavikConsLunReset) == 4);
static_assert(sizeof(TavikTargetReset) == 16 && offsetof(TavikTargetReset, Wwpn) == 4 &&
              offsetof(TavikTargetReset, OsLun) == 12);
static_assert(sizeof(TavikConsTargetReset) == 4);
static_assert(sizeof(TavikQChange) == 20 && offsetof(TavikQChange, Wwpn) == 4 && offsetof(TavikQChange, OsLun) == 12 &&
              offsetof(TavikQChange, NewVal) == 16);
static_assert(sizeof(TavikConsQChange) == 8 && offsetof(TavikConsQChange, NewVal) == 4);
static_assert(sizeof(TavikQFull) == 48 && offsetof(TavikQFull, Wwpn) == 4 && offsetof(TavikQFull, LenOsLun) == 12 &&
              offsetof(TavikQFull, OsLun) == 16);
static_assert(sizeof(TavikDevBsy) == 48 && offsetof(TavikDevBsy, Wwpn) == 4 && offsetof(TavikDevBsy, LenOsLun) == 12 &&
              offsetof(TavikDevBsy, OsLun) == 16);
static_assert(sizeof(TavikCheckCond) == 128 && offsetof(TavikCheckCond, Wwpn) == 4 &&
              offsetof(TavikCheckCond, SensKey) == 12 && offsetof(TavikCheckCond, Asc) == 16 &&
              offsetof(TavikCheckCond, OsLunLen) == 20 && offsetof(TavikCheckCond, OsLun) == 24 &&
              offsetof(TavikCheckCond, CmdCodeLen) == 56 && offsetof(TavikCheckCond, CmdCode) == 60 &&
              offsetof(TavikCheckCond, AscqLen) == 92 && offsetof(TavikCheckCond, Ascq) == 96);
static_assert(sizeof(TavikRscn) == 8 && offsetof(TavikRscn, FcId) == 4);

#endif
