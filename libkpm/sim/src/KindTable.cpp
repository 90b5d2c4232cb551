#include "libkpm/sim/src/KindTable.h"

#include <array>
#include <bit>

#include "libkpm/include/libkpm.h"

static constexpr std::uint32_t scAllLuns = 0xFFFFFFFFu;

static constexpr ZTSSimField sVersion(std::size_t aOffset) {
    return {"version", ZTSFF_Number,         static_cast<std::uint16_t>(aOffset), 4, ZTSDF_Constant, 0,
            0,         "version of the data"};
}

static constexpr ZTSSimField sNumber(const char* apName, std::size_t aOffset, std::uint32_t aDefault,
                                     std::uint32_t aStormLimit, const char* apMeaning) {
    return {apName,      ZTSFF_Number, static_cast<std::uint16_t>(aOffset), 4, ZTSDF_Constant, aDefault,
            aStormLimit, apMeaning};
}

static constexpr ZTSSimField sLun(std::size_t aOffset) {
    return {"lun", ZTSFF_Number, static_cast<std::uint16_t>(aOffset), 4, ZTSDF_Lun, 0, scAllLuns, "LUN, or all"};
}

static constexpr ZTSSimField sName(const char* apName, std::size_t aOffset, ZTESimDefault aDefault,
                                   const char* apMeaning) {
    return {apName, ZTSFF_Wwn, static_cast<std::uint16_t>(aOffset), 8, aDefault, 0, 0, apMeaning};
}

static constexpr ZTSSimField sCounter(const char* apName, std::size_t aOffset, ZTESimDefault aDefault,
                                      const char* apMeaning) {
    return {apName, ZTSFF_Number, static_cast<std::uint16_t>(aOffset), 4, aDefault, 0, 0, apMeaning};
}

static constexpr ZTSSimField sByte(const char* apName, std::size_t aOffset, std::uint32_t aDefault,
                                   const char* apMeaning) {
    return {apName, ZTSFF_Number, static_cast<std::uint16_t>(aOffset), 1, ZTSDF_Constant, aDefault, 0, apMeaning};
}

static constexpr ZTSSimField gcPlogi[] = {
    sVersion(offsetof(zt_plogi_rcv_v0, zt_plogir_version)),
    sName("portname", offsetof(zt_plogi_rcv_v0, zt_plogir_portname), ZTSDF_RemotePort, "remote port's name"),
    sName("nodename", offsetof(zt_plogi_rcv_v0, zt_plogir_nodename), ZTSDF_RemoteNode, "remote port's node name"),
};

static constexpr ZTSSimField gcPrlo[] = {
    sVersion(offsetof(zt_prlo_rcv_v0, zt_prlor_version)),
    sName("remoteport", offsetof(zt_prlo_rcv_v0, zt_prlor_remoteport), ZTSDF_RemotePort, "remote port's name"),
};

static constexpr ZTSSimField gcAdisc[] = {
    sVersion(offsetof(zt_adisc_rcv_v0, zt_adiscr_version)),
    sName("portname", offsetof(zt_adisc_rcv_v0, zt_adiscr_portname), ZTSDF_RemotePort, "remote port's name"),
    sName("nodename", offsetof(zt_adisc_rcv_v0, zt_adiscr_nodename), ZTSDF_RemoteNode, "remote port's node name"),
};

static constexpr ZTSSimField scLsrjt[] = {
    sVersion(offsetof(zt_lsrjt_rcv_v0, zt_lsrjtr_version)),
    sName("remoteport", offsetof(zt_lsrjt_rcv_v0, zt_lsrjtr_remoteport), ZTSDF_RemotePort, "remote port's name"),
    sNumber("command", offsetof(zt_lsrjt_rcv_v0, zt_lsrjtr_original_cmd), 0x03, 3, "ELS command that was rejected"),
    sNumber("reason", offsetof(zt_lsrjt_rcv_v0, zt_lsrjtr_reasoncode), 0x09, 11, "LS_RJT reason code"),
    sNumber("explanation", offsetof(zt_lsrjt_rcv_v0, zt_lsrjtr_reasoncodeexpl), 0, 63,
            "LS_RJT reason code explanation"),
};

static constexpr ZTSSimField gcLogo[] = {
    sVersion(offsetof(zt_logo_rcv_v0, zt_logo_version)),
    sName("remoteport", offsetof(zt_logo_rcv_v0, zt_logo_rportname), ZTSDF_RemotePort, "port that the LOGO came from"),
    sName("payloadport", offsetof(zt_logo_rcv_v0, zt_logo_payloadwwpn), ZTSDF_RemotePort, "port name in its payload"),
};

static constexpr ZTSSimField gcPortBusy[] = {
    sVersion(offsetof(zt_pbsy_rcv_v0, zt_pbsyr_version)),
    sName("remoteport", offsetof(zt_pbsy_rcv_v0, zt_pbsyr_rport), ZTSDF_RemotePort, "remote port's name"),
};

static constexpr ZTSSimField scFcpReadCheck[] = {
    sVersion(offsetof(zt_fcprdchkerr_v0, zt_fcprdchkerr_version)),
    sName("remoteport", offsetof(zt_fcprdchkerr_v0, zt_fcprdchkerr_rport), ZTSDF_RemotePort, "remote port's name"),
    sLun(offsetof(zt_fcprdchkerr_v0, zt_fcprdchkerr_lun)),
    sNumber("opcode", offsetof(zt_fcprdchkerr_v0, zt_fcprdchkerr_opcode), 0x28, 1, "SCSI operation code of the read"),
    sNumber("parameter", offsetof(zt_fcprdchkerr_v0, zt_fcprdchkerr_fcpiparam), 0, 65535, "FCP parameter word"),
};

static constexpr ZTSSimField scScsiGeneric[] = {
    sVersion(offsetof(ZT_scsi_generic_v0, zt_scsi_generic_version)),
    sName("remoteport", offsetof(ZT_scsi_generic_v0, zt_scsi_generic_rport), ZTSDF_RemotePort, "remote port's name"),
    sLun(offsetof(ZT_scsi_generic_v0, zt_scsi_generic_lun)),
};

static constexpr ZTSSimField gcCheckCondition[] = {
    sVersion(offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_version)),
    sName("remoteport", offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_rport), ZTSDF_RemotePort,
          "remote port's name"),
    sLun(offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_lun)),
    sNumber("opcode", offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_cmdcode), 0x28, 255, "SCSI operation code"),
    sNumber("sense", offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_senskey), 0x06, 1, "sense key, or unknown"),
    sNumber("asc", offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_asc), 0x29, 1,
            "additional sense code, or unknown"),
    sNumber("ascq", offsetof(zt_scsi_checkcondition_v0, zt_checkcondition_ascq), 0, 255,
            "additional sense code qualifier, or unknown"),
};

static constexpr ZTSSimField gcQueueDepth[] = {
    sVersion(offsetof(zt_scsi_varquedepth_v0, zt_varquedepth_version)),
    sName("remoteport", offsetof(zt_scsi_varquedepth_v0, zt_varquedepth_rport), ZTSDF_RemotePort, "remote port's name"),
    sLun(offsetof(zt_scsi_varquedepth_v0, zt_varquedepth_lun)),
    sNumber("old", offsetof(zt_scsi_varquedepth_v0, zt_varquedepth_oldval), 32, 64, "queue depth before, in commands"),
    sNumber("new", offsetof(zt_scsi_varquedepth_v0, zt_varquedepth_newval), 16, 64, "queue depth after"),
};

static constexpr ZTSSimField gcRscn[] = {
    {"command", ZTSFF_BigEndian, 0, 1, ZTSDF_Constant, 0x61, 0, "ELS command code"},
    {"pagelength", ZTSFF_BigEndian, 1, 1, ZTSDF_Constant, 4, 0, "bytes of a page"},
    {"payloadlength", ZTSFF_BigEndian, 2, 2, ZTSDF_RscnLength, 0, 0, "bytes of the payload as the RSCN states them"},
};

static constexpr ZTSSimField gcLink[] = {
    sCounter("tag", offsetof(LINKINFO, a_linkEventTag), ZTSDF_LinkTag, "counts the board's link events"),
    sCounter("up", offsetof(LINKINFO, a_linkUp), ZTSDF_LinkUp, "link-up events so far"),
    sCounter("down", offsetof(LINKINFO, a_linkDown), ZTSDF_LinkDown, "link-down events so far"),
    sNumber("multi", offsetof(LINKINFO, a_linkMulti), 0, 0, "1: several changes since the last event"),
    sCounter("did", offsetof(LINKINFO, a_DID), ZTSDF_LocalId, "FC id of the local port"),
    sByte("topology", offsetof(LINKINFO, a_topology), 0, "topology"),
    sByte("state", offsetof(LINKINFO, a_linkState), 0, "link state"),
    sByte("alpa", offsetof(LINKINFO, a_alpa), 0, "arbitrated loop address"),
    sByte("alpacount", offsetof(LINKINFO, a_alpaCnt), 0, "number of addresses in alpamap"),
    {"alpamap", ZTSFF_Bytes, offsetof(LINKINFO, a_alpaMap), 128, ZTSDF_Constant, 0, 0, "loop map, in hex"},
    sName("wwpn", offsetof(LINKINFO, a_wwpName), ZTSDF_LocalPort, "local port's name"),
    sName("wwnn", offsetof(LINKINFO, a_wwnName), ZTSDF_LocalNode, "local port's node name"),
};

static constexpr ZTSSimField scTemperature[] = {
    sNumber("first", 0, 0, 100, "first value handed to the callback"),
    sNumber("second", 4, 0, 100, "second value"),
};

static constexpr std::array<ZTSSimKind, gcSimKindCount> scSimKinds{{
    {"plogi", ZTSD_Scope, gcPlogi},
    {"prlo", ZTSD_Scope, gcPrlo},
    {"adisc", ZTSD_Scope, gcAdisc},
    {"lsrjt", ZTSD_Scope, scLsrjt},
    {"logo", ZTSD_Scope, gcLogo},
    {"rscn", ZTSD_Rscn, gcRscn},
    {"fabric-busy", ZTSD_Scope, {}},
    {"port-busy", ZTSD_Scope, gcPortBusy},
    {"fcp-read-check", ZTSD_Scope, scFcpReadCheck},
    {"queue-full", ZTSD_Scope, scScsiGeneric},
    {"device-busy", ZTSD_Scope, scScsiGeneric},
    {"check-condition", ZTSD_Scope, gcCheckCondition},
    {"lun-reset", ZTSD_Scope, scScsiGeneric},
    {"target-reset", ZTSD_Scope, scScsiGeneric},
    {"bus-reset", ZTSD_Scope, {}},
    {"queue-depth", ZTSD_Scope, gcQueueDepth},
    {"port-interrupt", ZTSD_Scope, {}},
    {"link", ZTSD_Link, gcLink},
    {"temperature", ZTSD_Temperature, scTemperature},
    {"adapter-arrival", ZTSD_Scope, {}},
}};

static constexpr bool sIsInCatalogueOrder() {
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        if (std::string_view(scSimKinds[lKind].mpName) != gcScopeEventKinds[lKind].mpName) {
            return false;
        }
    }
    return true;
}

static constexpr bool sHasOnlyNumbersOfAtMostFourBytes() {
    for (const ZTSSimKind& lrKind : scSimKinds) {
        for (const ZTSSimField& lrField : lrKind.mFields) {
            if ((lrField.mForm == ZTSFF_Number || lrField.mForm == ZTSFF_BigEndian) && lrField.mWidth > 4) {
                return false;
            }
        }
    }
    return true;
}

static constexpr bool sHasEveryFieldInsideItsData() {
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        for (const ZTSSimField& lrField : scSimKinds[lKind].mFields) {
            if (lrField.mOffset + lrField.mWidth > gcScopeEventKinds[lKind].mDataSize) {
                return false;
            }
        }
    }
    return true;
}

static_assert(sIsInCatalogueOrder());
static_assert(sHasEveryFieldInsideItsData());
static_assert(sHasOnlyNumbersOfAtMostFourBytes());
static_assert(sizeof(LINKINFO) == 168 && offsetof(LINKINFO, a_wwpName) == 152);

const ZTSSimKind& getSimKind(std::size_t aKind) {
    return scSimKinds.at(aKind);
}

void storeSimNumber(const ZTSSimField& acrField, std::uint32_t aNumber, std::uint8_t* apPlace) {
    const bool lIsBigEndian = acrField.mForm == ZTSFF_BigEndian || std::endian::native == std::endian::big;
    for (std::size_t lByte = 0; lByte < acrField.mWidth; ++lByte) {
        const std::size_t lFromRight = lIsBigEndian ? acrField.mWidth - 1u - lByte : lByte;
        apPlace[lByte] = static_cast<std::uint8_t>(aNumber >> (8 * lFromRight));
    }
}
