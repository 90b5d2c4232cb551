/// The command protocol between a sensor and the agent: codes, statuses, limits and file names, for both sides.
///
/// A message is a frame: a 4-byte length N in network byte order, then N bytes. A request's first byte is a command
/// code, a response's first byte an outcome. docs/protocol.md gives every message field by field.
#ifndef SENSOR_AGENTCOMMON_INCLUDE_SENSORAGENTPROTOCOL_H
#define SENSOR_AGENTCOMMON_INCLUDE_SENSORAGENTPROTOCOL_H

#include <cstdint>

#include "common/include/Framing.h"

/// First byte of a request.
enum ZTETavikCommand : std::uint8_t {
    ZTSTVKC_StartScope = 0,
    ZTSTVKC_GetScopeData = 1,
    ZTSTVKC_Stop = 2,
    ZTSTVKC_RegisterTargets = 3,
    ZTSTVKC_ShutDown = 4,
    ZTSTVKC_CollectionPeriod = 5
};

/// First byte of a response.
enum ZTEResponseOutcome : std::uint8_t {
    ZTRO_Success = 0,   ///< then a signed 32-bit result, always 0
    ZTRO_Failed = 1,    ///< then an unsigned 16-bit ZTESensorAgentProtocolStatus
    ZTRO_ScopeData = 2  ///< then the record lists
};

/// Status of a failed response. On the wire it is cut to 16 bits.
enum ZTESensorAgentProtocolStatus : std::uint32_t {
    ZTSAPS_Success = 0,
    ZTSAPS_VarCreate = 4,
    ZTSAPS_Invalid = 6,
    ZTSAPS_NotFound = 8,
    ZTSAPS_NotAllowed = 9,
    ZTSAPS_Exists = 10,
    ZTSAPS_Repeat = 11,
    ZTSAPS_NotSupported = 12,
    ZTSAPS_ConnectFailed = 325,
    ZTSAPS_OpenFailed = 326,
    ZTSAPS_LockFailed = 335,
    ZTSAPS_UnlockFailed = 336,
    ZTSAPS_RefreshFailed = 490,
    ZTSAPS_Max = 491  ///< bound, never sent
};

/// Environment variable that names the sensor's install directory, and the names that are appended to it.
inline constexpr const char* gcSensorDirVariable = "ZT_QRV_SENSOR_DIR";
inline constexpr const char* gcCommandFifoName = "/qrvtvkcmd.fifo";
inline constexpr const char* gcResponseFifoName = "/qrvtvkout.fifo";
inline constexpr const char* gcAgentPidFileName = "/qrv-tvk.pid";
inline constexpr const char* gcSensorPidFileName = "/qrv-sn.pid";

/// The program that acts as the sensor holds a flock on this file while it talks. The agent does not touch it.
inline constexpr const char* gcSensorLockFileName = "/qrv-sn.lock";

#endif
