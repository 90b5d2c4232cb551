/* clang-format off */
/*
 * libkpm.h - the interface between the agent and an adapters' library
 *
 * An adapters' library is a shared object that reports the events of a host's Fibre Channel adapters. The agent loads
 * one (the path in the environment variable ZT_LIBKPM_PATH, or libkpm.so.1 where that is unset), asks it for its table
 * of functions with KPM_GetFunctionList, and reaches everything else through that table. This header is the whole
 * contract: a library that does what the comments here say works with the agent.
 *
 * WORDS
 *   board   one local adapter port (an initiator), named by its index: 0 to GetNumberOfAdapters() - 1. A board keeps
 *           its index for as long as the library is open.
 *   WWN     an 8-byte Fibre Channel world wide name, in the byte order of the wire. WWNN: a node's, WWPN: a port's.
 *   kind    a category and a subcategory: what happened. A subcategory is a single bit of its category's mask.
 *
 * THREADS
 *   Init, GetNumberOfAdapters, IsZtapiSupported and GetAdapterInfo are first called by the agent's main thread, one
 *   after the other. From then on one thread at a time calls GetNumberOfAdapters, the registrations and Close: the
 *   agent's command thread. No entry is called from inside a callback.
 *   The library calls the callbacks on threads of its own, from as many at once as it likes, also before the
 *   registration call that asked for them has returned. It holds none of its own locks while it does: a callback may
 *   wait for a lock that a caller of GetNumberOfAdapters holds.
 *   The agent blocks the signals that stop it before it loads the library, so that the library's threads inherit that;
 *   a library does not unblock them.
 *
 * OWNERSHIP
 *   Everything is borrowed for the length of one call, in both directions: what a callback's pointers point to may be
 *   gone when the callback returns (the agent copies), and so may what an entry's pointers point to when the entry
 *   returns. The exceptions are the function table and the code behind it, which live until the library is unloaded,
 *   the context pointers, which the library hands back and never reads, and the callbacks themselves, which live until
 *   Close returns. Nothing that is pointed to need be aligned.
 *
 * EXIT
 *   The agent closes and unloads the library when it is told to shut down. When it ends for another reason (a stop
 *   signal, a sensor that died) the process exits with the library open and its threads running: code that the library
 *   runs at exit (destructors of static objects, atexit) neither joins its threads nor frees what they use.
 *
 * BYTE ORDER
 *   Integers are in the host's order, except inside an RSCN payload, which stands as on the wire.
 */
/* clang-format on */
#ifndef LIBKPM_H
#define LIBKPM_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* ---- Names and events ---- */

/* A world wide name as on the wire (the shape of the common HBA API, SNIA FC-HBA). Passed by value. */
typedef struct HBA_wwn {
    uint8_t wwn[8];
} HBA_wwn;

/* Categories of the events that are registered per port, with ZtapiRegEvent. */
#define ZT_REG_ELS_EVENT 0x01u
#define ZT_REG_FABRIC_EVENT 0x02u
#define ZT_REG_SCSI_EVENT 0x04u
#define ZT_REG_BOARD_EVENT 0x08u
#define ZT_REG_ADAPTER_EVENT 0x10u

/* Subcategories of ELS events: an extended link service request or reply was received. */
#define ZT_ELS_SUBCATEGORY_PLOGI_RCV 0x01u
#define ZT_ELS_SUBCATEGORY_PRLO_RCV 0x02u
#define ZT_ELS_SUBCATEGORY_ADISC_RCV 0x04u
#define ZT_ELS_SUBCATEGORY_LSRJT_RCV 0x08u
#define ZT_ELS_SUBCATEGORY_LOGO_RCV 0x10u
#define ZT_ELS_SUBCATEGORY_VALID_MASK 0x1Fu

/* Subcategories of fabric events. */
#define ZT_FABRIC_SUBCATEGORY_FABRIC_BUSY 0x01u
#define ZT_FABRIC_SUBCATEGORY_PORT_BUSY 0x02u
#define ZT_FABRIC_SUBCATEGORY_FCPRDCHKERR 0x04u
#define ZT_FABRIC_SUBCATEGORY_MASK 0x07u

/* Subcategories of SCSI events. */
#define ZT_SCSI_SUBCATEGORY_QFULL 0x01u
#define ZT_SCSI_SUBCATEGORY_DEVBSY 0x02u
#define ZT_SCSI_SUBCATEGORY_CHECKCONDITION 0x04u
#define ZT_SCSI_SUBCATEGORY_LUNRESET 0x08u
#define ZT_SCSI_SUBCATEGORY_TGTRESET 0x10u
#define ZT_SCSI_SUBCATEGORY_BUSRESET 0x20u
#define ZT_SCSI_SUBCATEGORY_VARQUEDEPTH 0x40u
#define ZT_SCSI_SUBCATEGORY_VALID_MASK 0x7Fu

/* Subcategories of board and adapter events. */
#define ZT_BOARD_SUBCATEGORY_PORTINTERR 0x01u
#define ZT_BOARD_SUBCATEGORY_VALID_MASK 0x01u
#define ZT_ADAPTER_SUBCATEGORY_ARRIVAL 0x01u
#define ZT_ADAPTER_SUBCATEGORY_VALID_MASK 0x01u

/* Event types that are registered per board, with KpmRegEvent. */
#define FC_REG_LINK_EVENT 0x01u
#define FC_REG_RSCN_EVENT 0x02u
#define FC_REG_TEMPERATURE_EVENT 0x20u

/*
 * One event as the scope callback gets it, 64-bit layout.
 *
 * zt_evt_size counts the event's data plus a header of 40 bytes; only its low 32 bits count, and a value below 40
 * counts as 40, which is no data. zt_evt_payload points to a ZT_event_payload, or is null where the kind has no data.
 */
#define ZT_EVENT_VERSION 0u
#define ZT_EVENT_HEADER_SIZE 40u

typedef struct ZT_event_payload {
    uint64_t zt_payload_reserved; /* not read */
    void* zt_payload_data;        /* the kind's structure below; null counts as no data */
} ZT_event_payload;

typedef struct ZT_event {
    uint32_t zt_evt_version; /* ZT_EVENT_VERSION */
    uint64_t zt_evt_size;    /* at offset 8 */
    void* zt_evt_payload;    /* at offset 16 */
} ZT_event;

/*
 * The data of each kind. The version words are 0. Ports are remote ports. A LUN of 0xFFFFFFFF means all LUNs, or that
 * the LUN is not known. The integers of SCSI and ELS fields carry the protocol's values (FC-LS, SPC) widened to 32
 * bits.
 */
typedef struct zt_plogi_rcv_v0 { /* ELS 0x01 */
    uint32_t zt_plogir_version;
    HBA_wwn zt_plogir_portname;
    HBA_wwn zt_plogir_nodename;
} zt_plogi_rcv_v0;

typedef struct zt_prlo_rcv_v0 { /* ELS 0x02 */
    uint32_t zt_prlor_version;
    HBA_wwn zt_prlor_remoteport;
} zt_prlo_rcv_v0;

typedef struct zt_adisc_rcv_v0 { /* ELS 0x04 */
    uint32_t zt_adiscr_version;
    HBA_wwn zt_adiscr_portname;
    HBA_wwn zt_adiscr_nodename;
} zt_adisc_rcv_v0;

typedef struct zt_lsrjt_rcv_v0 { /* ELS 0x08 */
    uint32_t zt_lsrjtr_version;
    HBA_wwn zt_lsrjtr_remoteport;
    uint32_t zt_lsrjtr_original_cmd;   /* the ELS command code that was rejected */
    uint32_t zt_lsrjtr_reasoncode;     /* LS_RJT reason code */
    uint32_t zt_lsrjtr_reasoncodeexpl; /* LS_RJT reason code explanation */
} zt_lsrjt_rcv_v0;

typedef struct zt_logo_rcv_v0 { /* ELS 0x10 */
    uint32_t zt_logo_version;
    HBA_wwn zt_logo_rportname;   /* the port the LOGO came from */
    HBA_wwn zt_logo_payloadwwpn; /* the port name in the LOGO's payload */
} zt_logo_rcv_v0;

typedef struct zt_pbsy_rcv_v0 { /* fabric 0x02 */
    uint32_t zt_pbsyr_version;
    HBA_wwn zt_pbsyr_rport;
} zt_pbsy_rcv_v0;

typedef struct zt_fcprdchkerr_v0 { /* fabric 0x04 */
    uint32_t zt_fcprdchkerr_version;
    HBA_wwn zt_fcprdchkerr_rport;
    uint32_t zt_fcprdchkerr_lun;
    uint32_t zt_fcprdchkerr_opcode;    /* SCSI operation code of the read */
    uint32_t zt_fcprdchkerr_fcpiparam; /* the FCP parameter word that did not check */
} zt_fcprdchkerr_v0;

typedef struct ZT_scsi_generic_v0 { /* SCSI 0x01, 0x02, 0x08, 0x10 */
    uint32_t zt_scsi_generic_version;
    HBA_wwn zt_scsi_generic_rport;
    uint32_t zt_scsi_generic_lun;
} ZT_scsi_generic_v0;

typedef struct zt_scsi_checkcondition_v0 { /* SCSI 0x04 */
    uint32_t zt_checkcondition_version;
    HBA_wwn zt_checkcondition_rport;
    uint32_t zt_checkcondition_lun;
    uint32_t zt_checkcondition_cmdcode; /* SCSI operation code */
    uint32_t zt_checkcondition_senskey; /* sense key; 0xFFFFFFFF where the sense data are not known */
    uint32_t zt_checkcondition_asc;     /* additional sense code; likewise */
    uint32_t zt_checkcondition_ascq;    /* additional sense code qualifier; likewise */
} zt_scsi_checkcondition_v0;

typedef struct zt_scsi_varquedepth_v0 { /* SCSI 0x40 */
    uint32_t zt_varquedepth_version;
    HBA_wwn zt_varquedepth_rport;
    uint32_t zt_varquedepth_lun;
    uint32_t zt_varquedepth_oldval; /* queue depth before the change, in commands */
    uint32_t zt_varquedepth_newval; /* queue depth after the change */
} zt_scsi_varquedepth_v0;

/* What the link callback gets: 168 bytes, the size that the link registration names. */
typedef struct LINKINFO {
    uint32_t a_linkEventTag; /* counts the link events of the board */
    uint32_t a_linkUp;       /* number of link-up events so far */
    uint32_t a_linkDown;     /* number of link-down events so far */
    uint32_t a_linkMulti;    /* 1: more than one change since the last event */
    uint32_t a_DID;          /* FC id of the local port, 0 while the link is down */
    uint8_t a_topology;
    uint8_t a_linkState;
    uint8_t a_alpa;
    uint8_t a_alpaCnt;
    uint8_t a_alpaMap[128];
    HBA_wwn a_wwpName; /* the local port's names */
    HBA_wwn a_wwnName;
} LINKINFO;

/* ---- Callbacks ---- */

/*
 * Called for every event that was registered with ZtapiRegEvent: board, local port, category, subcategory, the context
 * given at registration, the event. Never throws and never calls back into the library.
 */
typedef void (*KPM_ScopeCallback)(unsigned board, HBA_wwn port, unsigned category, unsigned subcategory, void* context,
                                  ZT_event* event);

/* clang-format off */
/*
 * A generic function pointer for the events of KpmRegEvent. The library converts it back to the type of the event it
 * was registered for before it calls it:
 *   FC_REG_LINK_EVENT         KPM_LinkCallback         board, a LINKINFO (never null)
 *   FC_REG_RSCN_EVENT         KPM_RscnCallback         board, the payload from its command code on, its length in
 *                                                      bytes. The payload is whole: as many bytes as its own length
 *                                                      field says.
 *   FC_REG_TEMPERATURE_EVENT  KPM_TemperatureCallback  board, and two values that the agent does not keep
 */
/* clang-format on */
typedef void (*KPM_EventCallback)(unsigned board, ...);
typedef void (*KPM_LinkCallback)(unsigned board, void* linkInfo);
typedef void (*KPM_RscnCallback)(unsigned board, void* payload, unsigned length);
typedef void (*KPM_TemperatureCallback)(unsigned board, unsigned first, unsigned second);

/* ---- Registration statuses ---- */

/*
 * ZtapiRegEvent answers 0, or one of three informational statuses that count as success, or any other value for a
 * refusal. A handle is written for these four; it is 0 only where nothing will ever be delivered.
 */
#define KPM_STATUS_SUCCESS 0u
#define KPM_STATUS_INFO_5 5u    /* accepted; the library's own remark */
#define KPM_STATUS_NO_SOURCE 6u /* accepted and never delivered: this library has no source for that kind here */
#define KPM_STATUS_NO_RIGHTS 7u /* accepted; this host does not grant what its source needs (rights, a name space) */

/* ---- Reports ---- */

/* The states of a kind on a board, as a library reports them. */
#define KPM_STATE_WORKING 1u   /* events of this kind are delivered */
#define KPM_STATE_NO_SOURCE 2u /* this library has no source for the kind on this board */
#define KPM_STATE_NO_RIGHTS 3u /* this host does not grant what the source needs; it may come later */
#define KPM_STATE_FAILED 4u    /* the source is broken */

/*
 * Reports the state of a kind on a board: on every change, and once before the registration of a kind whose
 * registration answers with a handle alone. `category` and `subcategory` are the pair that the kind is delivered as
 * (RSCN 1 and 0x20, link 8 and 0x02, temperature 8 and 0x04). `reason` says why in a few words that people read, such
 * as "needs CAP_NET_ADMIN"; null or empty where there is nothing to say. Longer than 111 bytes it is cut.
 */
typedef void (*KPM_StateFunction)(void* context, uint32_t board, uint32_t category, uint32_t subcategory,
                                  uint32_t state, const char* reason);

/*
 * Reports how much the library has lost so far, under a name that people read, such as "trace events": the running
 * total since Init, on every change but at most some times a second. A total that is smaller than the last one is
 * ignored. At most 32 names; a name longer than 55 bytes is cut.
 */
typedef void (*KPM_LossFunction)(void* context, const char* name, uint64_t total);

/* ---- The table of functions ---- */

#define KPM_INTERFACE_VERSION 1u

/* The size of the structure up to and including the ninth function: the least that the agent accepts. */
#define KPM_FUNCTION_LIST_SIZE_V1 80u

/* The size of the structure up to and including SetLog. */
#define KPM_FUNCTION_LIST_SIZE_LOG 88u

/* The size of the structure up to and including SetReport. */
#define KPM_FUNCTION_LIST_SIZE_REPORT 96u

/* Levels of a line for the agent's log. The agent counts a level that it does not know as a warning. */
#define KPM_LOG_ERROR 1u
#define KPM_LOG_WARNING 2u
#define KPM_LOG_NOTICE 3u
#define KPM_LOG_INFO 4u

/*
 * Writes one line to the agent's log: a level, and a text of the library's own that ends with a null byte and is
 * borrowed for the call. May be called from any thread, from inside the library's entries too, but never with a lock of
 * the library held that an entry takes. Never throws and never calls back into the library. A library keeps its lines
 * few: what can happen often is counted, and the count told at most once a second.
 */
typedef void (*KPM_LogFunction)(uint32_t level, const char* text);

/*
 * The library's functions. None of the first nine is null. Later versions of this header append entries; the agent uses
 * one only where `size` covers it, and it may be null.
 */
typedef struct KPM_FunctionList {
    uint32_t version; /* KPM_INTERFACE_VERSION */
    uint32_t size;    /* sizeof(KPM_FunctionList) as the library was built */

    /* Opens the library. 0: success. Any other status ends the agent's start with an error that names it; Close is not
       called then. */
    uint32_t (*Init)(void);

    /* Closes the library and returns when every thread of the library has ended and no callback runs any more. It may
       wait for callbacks; its caller holds no lock that a callback needs. Registrations end with it. */
    void (*Close)(void);

    /* The number of boards now. Never waits for a callback: the agent may hold locks that callbacks want. */
    uint32_t (*GetNumberOfAdapters)(void);

    /* 1: the installed driver offers the event interface, 0: it does not (too old). */
    uint32_t (*IsZtapiSupported)(void);

    /* Writes the names of the board `index`. 0: success; any other status ends the agent's start. */
    uint32_t (*GetAdapterInfo)(uint32_t index, HBA_wwn* nodeName, HBA_wwn* portName);

    /* Registers `callback` for one kind on the board's port `port`. Returns a registration status (above); writes
       `*handle` for those that count as success and leaves it alone otherwise. Registering the same kind again is
       allowed (the agent does so when a start failed half-way): the newest registration is the one that counts, so that
       each event is delivered once. */
    uint32_t (*ZtapiRegEvent)(uint32_t board, HBA_wwn port, uint32_t category, uint32_t subcategory, void* context,
                              uint32_t* handle, KPM_ScopeCallback callback);

    /* Ends a registration. 0: success. A callback that runs on another thread may still be running on return. */
    uint32_t (*ZtapiUnregEvent)(uint32_t board, HBA_wwn port, uint32_t handle);

    /* Registers `callback` for one event type of a board. `size` is the number of bytes the caller reads of the event's
       data at most: 168 for link, 1024 for RSCN, 0 for temperature (for RSCN a hint only: a longer payload is delivered
       whole). Returns a handle, 0: failed. A library without a source for an event type answers 0 for temperature,
       which the agent does without, and for link and RSCN a handle that nothing is ever delivered for: the agent cannot
       start without those two. Registering again: as for ZtapiRegEvent. */
    uint32_t (*KpmRegEvent)(uint32_t board, uint32_t eventType, void* context, uint32_t size,
                            KPM_EventCallback callback);

    /* Ends a registration of KpmRegEvent. 0: success. */
    uint32_t (*KpmUnregEvent)(uint32_t board, uint32_t handle);

    /* ---- Appended entries: optional ---- */

    /* Hands the library the agent's log. Called once, after KPM_GetFunctionList and before Init. `log` may be called
       until the library is unloaded. */
    void (*SetLog)(KPM_LogFunction log);

    /* Hands the library the agent's functions for reports, and the context that each of their calls gets. Called once,
       after SetLog and before Init. Both may be called from any thread, also from inside the library's entries and with
       its locks held, until the library is unloaded. They copy the texts, never wait for long, never throw and never
       call back into the library. */
    void (*SetReport)(void* context, KPM_StateFunction state, KPM_LossFunction loss);
} KPM_FunctionList;

/*
 * The one symbol that an adapters' library exports. `version` is the version the caller speaks. Returns 0 and writes
 * `*list` where the library speaks it too; any other value, and no write, where it does not. Called once after loading,
 * before Init.
 */
typedef uint32_t (*KPM_GetFunctionListType)(uint32_t version, const KPM_FunctionList** list);
uint32_t KPM_GetFunctionList(uint32_t version, const KPM_FunctionList** list);

#ifdef __cplusplus
}
#endif

#endif /* LIBKPM_H */
