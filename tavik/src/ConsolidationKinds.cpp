#include "tavik/include/ConsolidationKinds.h"

#include <cstddef>
#include <string_view>

#include "libkpm/include/ScopeEventKinds.h"
#include "libkpm/include/libkpm.h"
#include "sensor/agentcommon/include/EventDataRecords.h"

namespace {

// The payload field `from` goes to the record field `to`.
#define ZT_COPY(Payload, from, Record, to) \
    { offsetof(Payload, from), offsetof(Record, to), sizeof(Record::to) }

// The payload field `from` sets a bit of the record field `to`, of which `length` counts the bits.
#define ZT_SET_BIT(Payload, from, Record, length, to, hasAll) \
    { offsetof(Payload, from), offsetof(Record, length), offsetof(Record, to), hasAll }

static_assert(offsetof(zt_plogi_rcv_v0, zt_plogir_portname) == gcRemotePortOffset);
static_assert(offsetof(zt_prlo_rcv_v0, zt_prlor_remoteport) == gcRemotePortOffset);
static_assert(offsetof(zt_adisc_rcv_v0, zt_adiscr_portname) == gcRemotePortOffset);
static_assert(offsetof(zt_lsrjt_rcv_v0, zt_lsrjtr_remoteport) == gcRemotePortOffset);
static_assert(offsetof(zt_logo_rcv_v0, zt_logo_rportname) == gcRemotePortOffset);
static_assert(offsetof(zt_pbsy_rcv_v0, zt_pbsyr_rport) == gcRemotePortOffset);
static_assert(offsetof(zt_fcprdchkerr_v0, zt_fcprdchkerr_rport) == gcRemotePortOffset);
static_assert(offsetof(ZT_scsi_generic_v0, zt_scsi_generic_rport) == gcRemotePortOffset);
static_assert(offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_rport) == gcRemotePortOffset);
static_assert(offsetof(zt_scsi_varquedepth_v0, zt_varquedepth_rport) == gcRemotePortOffset);

static_assert(SIZE_QFULL_OSLUN_BITFIELD == gcBitFieldSize && SIZE_DEVBSY_OSLUN_BITFIELD == gcBitFieldSize &&
              SIZE_CHECKCOND_OSLUN_BITFIELD == gcBitFieldSize && SIZE_CHECKCOND_CMDCODE_BITFIELD == gcBitFieldSize &&
              SIZE_CHECKCOND_ASCQ_BITFIELD == gcBitFieldSize);
static_assert(sizeof(TavikCheckCond) <= gcMaxRecordDataSize);

}  // namespace

constexpr ZTSConsolidationKind gcPlogiKind = {
    .mMinimumLength = sizeof(zt_plogi_rcv_v0),
    .mContinuation = ZTCN_Count,
    .mIdentityNames = {gcRemotePortOffset, offsetof(zt_plogi_rcv_v0, zt_plogir_nodename)},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikPlogi),
    .mRecordFields = {ZT_COPY(zt_plogi_rcv_v0, zt_plogir_portname, TavikPlogi, Wwpn),
                      ZT_COPY(zt_plogi_rcv_v0, zt_plogir_nodename, TavikPlogi, PayloadWwpn)},
    .mAppendedSize = 0,
    .mAppendedFields = {},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcPrloKind = {
    .mMinimumLength = sizeof(zt_prlo_rcv_v0),
    .mContinuation = ZTCN_Count,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikPrlo),
    .mRecordFields = {ZT_COPY(zt_prlo_rcv_v0, zt_prlor_remoteport, TavikPrlo, Wwpn)},
    .mAppendedSize = 0,
    .mAppendedFields = {},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcAdiscKind = {
    .mMinimumLength = sizeof(zt_adisc_rcv_v0),
    .mContinuation = ZTCN_Count,
    .mIdentityNames = {gcRemotePortOffset, offsetof(zt_adisc_rcv_v0, zt_adiscr_nodename)},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikAdisc),
    .mRecordFields = {ZT_COPY(zt_adisc_rcv_v0, zt_adiscr_portname, TavikAdisc, Wwpn),
                      ZT_COPY(zt_adisc_rcv_v0, zt_adiscr_nodename, TavikAdisc, Wwnn)},
    .mAppendedSize = 0,
    .mAppendedFields = {},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcLsRjtKind = {
    .mMinimumLength = sizeof(zt_lsrjt_rcv_v0),
    .mContinuation = ZTCN_Append,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {offsetof(zt_lsrjt_rcv_v0, zt_lsrjtr_original_cmd)},
    .mRecordSize = sizeof(TavikLsRjt),
    .mRecordFields = {ZT_COPY(zt_lsrjt_rcv_v0, zt_lsrjtr_remoteport, TavikLsRjt, Wwpn),
                      ZT_COPY(zt_lsrjt_rcv_v0, zt_lsrjtr_original_cmd, TavikLsRjt, OrgCmd),
                      ZT_COPY(zt_lsrjt_rcv_v0, zt_lsrjtr_reasoncode, TavikLsRjt, ReasonCode),
                      ZT_COPY(zt_lsrjt_rcv_v0, zt_lsrjtr_reasoncodeexpl, TavikLsRjt, ReasonCodeExpl)},
    .mAppendedSize = sizeof(TavikConsLsRjt),
    .mAppendedFields = {ZT_COPY(zt_lsrjt_rcv_v0, zt_lsrjtr_reasoncode, TavikConsLsRjt, ReasonCode),
                        ZT_COPY(zt_lsrjt_rcv_v0, zt_lsrjtr_reasoncodeexpl, TavikConsLsRjt, ReasonCodeExpl)},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcLogoKind = {
    .mMinimumLength = sizeof(zt_logo_rcv_v0),
    .mContinuation = ZTCN_Count,
    .mIdentityNames = {gcRemotePortOffset, offsetof(zt_logo_rcv_v0, zt_logo_payloadwwpn)},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikLogo),
    .mRecordFields = {ZT_COPY(zt_logo_rcv_v0, zt_logo_rportname, TavikLogo, Wwpn),
                      ZT_COPY(zt_logo_rcv_v0, zt_logo_payloadwwpn, TavikLogo, PayloadWwpn)},
    .mAppendedSize = 0,
    .mAppendedFields = {},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcPortBusyKind = {
    .mMinimumLength = sizeof(zt_pbsy_rcv_v0),
    .mContinuation = ZTCN_Count,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikPortBusy),
    .mRecordFields = {ZT_COPY(zt_pbsy_rcv_v0, zt_pbsyr_rport, TavikPortBusy, Wwpn)},
    .mAppendedSize = 0,
    .mAppendedFields = {},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcFcprdChkErrKind = {
    .mMinimumLength = sizeof(zt_fcprdchkerr_v0),
    .mContinuation = ZTCN_Append,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {offsetof(zt_fcprdchkerr_v0, zt_fcprdchkerr_lun),
                         offsetof(zt_fcprdchkerr_v0, zt_fcprdchkerr_opcode)},
    .mRecordSize = sizeof(TavikFcprdChkErr),
    .mRecordFields = {ZT_COPY(zt_fcprdchkerr_v0, zt_fcprdchkerr_rport, TavikFcprdChkErr, Wwpn),
                      ZT_COPY(zt_fcprdchkerr_v0, zt_fcprdchkerr_opcode, TavikFcprdChkErr, OpCode),
                      ZT_COPY(zt_fcprdchkerr_v0, zt_fcprdchkerr_lun, TavikFcprdChkErr, OsLun),
                      ZT_COPY(zt_fcprdchkerr_v0, zt_fcprdchkerr_fcpiparam, TavikFcprdChkErr, FcpiParam)},
    .mAppendedSize = sizeof(TavikConsFcprdChkErr),
    .mAppendedFields = {ZT_COPY(zt_fcprdchkerr_v0, zt_fcprdchkerr_fcpiparam, TavikConsFcprdChkErr, FcpiParam)},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcQFullKind = {
    .mMinimumLength = sizeof(ZT_scsi_generic_v0),
    .mContinuation = ZTCN_SetBits,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikQFull),
    .mRecordFields = {ZT_COPY(ZT_scsi_generic_v0, zt_scsi_generic_rport, TavikQFull, Wwpn)},
    .mAppendedSize = 0,
    .mAppendedFields = {},
    .mBitFields = {ZT_SET_BIT(ZT_scsi_generic_v0, zt_scsi_generic_lun, TavikQFull, LenOsLun, OsLun, true)}};

constexpr ZTSConsolidationKind gcDevBsyKind = {
    .mMinimumLength = sizeof(ZT_scsi_generic_v0),
    .mContinuation = ZTCN_SetBits,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikDevBsy),
    .mRecordFields = {ZT_COPY(ZT_scsi_generic_v0, zt_scsi_generic_rport, TavikDevBsy, Wwpn)},
    .mAppendedSize = 0,
    .mAppendedFields = {},
    .mBitFields = {ZT_SET_BIT(ZT_scsi_generic_v0, zt_scsi_generic_lun, TavikDevBsy, LenOsLun, OsLun, true)}};

constexpr ZTSConsolidationKind gcCheckCondKind = {
    .mMinimumLength = sizeof(zt_scsi_checkcondition_v0),
    .mContinuation = ZTCN_SetBits,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_senskey),
                         offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_asc)},
    .mRecordSize = sizeof(TavikCheckCond),
    .mRecordFields = {ZT_COPY(zt_scsi_checkcondition_v0, zt_checkcondition_rport, TavikCheckCond, Wwpn),
                      ZT_COPY(zt_scsi_checkcondition_v0, zt_checkcondition_senskey, TavikCheckCond, SensKey),
                      ZT_COPY(zt_scsi_checkcondition_v0, zt_checkcondition_asc, TavikCheckCond, Asc)},
    .mAppendedSize = 0,
    .mAppendedFields = {},
    .mBitFields = {
        ZT_SET_BIT(zt_scsi_checkcondition_v0, zt_checkcondition_lun, TavikCheckCond, OsLunLen, OsLun, true),
        ZT_SET_BIT(zt_scsi_checkcondition_v0, zt_checkcondition_cmdcode, TavikCheckCond, CmdCodeLen, CmdCode, false),
        ZT_SET_BIT(zt_scsi_checkcondition_v0, zt_checkcondition_ascq, TavikCheckCond, AscqLen, Ascq, false)}};

constexpr ZTSConsolidationKind gcLunResetKind = {
    .mMinimumLength = sizeof(ZT_scsi_generic_v0),
    .mContinuation = ZTCN_Append,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikLunReset),
    .mRecordFields = {ZT_COPY(ZT_scsi_generic_v0, zt_scsi_generic_rport, TavikLunReset, Wwpn),
                      ZT_COPY(ZT_scsi_generic_v0, zt_scsi_generic_lun, TavikLunReset, OsLun)},
    .mAppendedSize = sizeof(TavikConsLunReset),
    .mAppendedFields = {ZT_COPY(ZT_scsi_generic_v0, zt_scsi_generic_lun, TavikConsLunReset, OsLun)},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcTargetResetKind = {
    .mMinimumLength = sizeof(ZT_scsi_generic_v0),
    .mContinuation = ZTCN_Append,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikTargetReset),
    .mRecordFields = {ZT_COPY(ZT_scsi_generic_v0, zt_scsi_generic_rport, TavikTargetReset, Wwpn),
                      ZT_COPY(ZT_scsi_generic_v0, zt_scsi_generic_lun, TavikTargetReset, OsLun)},
    .mAppendedSize = sizeof(TavikConsTargetReset),
    .mAppendedFields = {ZT_COPY(ZT_scsi_generic_v0, zt_scsi_generic_lun, TavikConsTargetReset, OsLun)},
    .mBitFields = {}};

constexpr ZTSConsolidationKind gcVarQDepthKind = {
    .mMinimumLength = sizeof(zt_scsi_varquedepth_v0),
    .mContinuation = ZTCN_Append,
    .mIdentityNames = {gcRemotePortOffset},
    .mIdentityNumbers = {},
    .mRecordSize = sizeof(TavikQChange),
    .mRecordFields = {ZT_COPY(zt_scsi_varquedepth_v0, zt_varquedepth_rport, TavikQChange, Wwpn),
                      ZT_COPY(zt_scsi_varquedepth_v0, zt_varquedepth_lun, TavikQChange, OsLun),
                      ZT_COPY(zt_scsi_varquedepth_v0, zt_varquedepth_newval, TavikQChange, NewVal)},
    .mAppendedSize = sizeof(TavikConsQChange),
    .mAppendedFields = {ZT_COPY(zt_scsi_varquedepth_v0, zt_varquedepth_lun, TavikConsQChange, OsLun),
                        ZT_COPY(zt_scsi_varquedepth_v0, zt_varquedepth_newval, TavikConsQChange, NewVal)},
    .mBitFields = {}};

namespace {

constexpr bool sHasSizesOf(const ZTSConsolidationKind& acrKind, std::string_view aName) {
    const ZTSScopeEventKind& lrKind = gcScopeEventKinds[findKindIndex(aName).value()];
    return acrKind.mMinimumLength == lrKind.mDataSize && acrKind.mRecordSize == lrKind.mRecordSize &&
           acrKind.mAppendedSize == lrKind.mEntrySize;
}

static_assert(sHasSizesOf(gcPlogiKind, "plogi") && sHasSizesOf(gcPrloKind, "prlo") &&
              sHasSizesOf(gcAdiscKind, "adisc") && sHasSizesOf(gcLsRjtKind, "lsrjt") &&
              sHasSizesOf(gcLogoKind, "logo"));
static_assert(sHasSizesOf(gcPortBusyKind, "port-busy") && sHasSizesOf(gcFcprdChkErrKind, "fcp-read-check"));
static_assert(sHasSizesOf(gcQFullKind, "queue-full") && sHasSizesOf(gcDevBsyKind, "device-busy") &&
              sHasSizesOf(gcCheckCondKind, "check-condition") && sHasSizesOf(gcLunResetKind, "lun-reset") &&
              sHasSizesOf(gcTargetResetKind, "target-reset") && sHasSizesOf(gcVarQDepthKind, "queue-depth"));

}  // namespace
