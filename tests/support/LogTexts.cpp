#include "tests/support/LogTexts.h"

#include <cctype>
#include <cinttypes>
#include <map>
#include <tuple>

static constexpr ZTELogTextPath sAgent = ZTELogTextPath::Agent;
static constexpr ZTELogTextPath sProcess = ZTELogTextPath::Process;

const std::vector<ZTSLogText>& logTexts() {
    static const auto& srTexts = *new std::vector<ZTSLogText>{
        {32, "-N-", ".//TavikMain", "main", "Starting the Tavik", sAgent},
        {1, "-H-", ".//TavikMain", "main", "Tavik System exiting", sAgent},
        {64, "-I-", ".//TavikMain", "main", "Exit condition", sAgent},
        {64, "-I-", ".//TavikMain", "main", "Failed with error - %s, exiting abruptly", sAgent},
        {64, "-I-", ".//TavikSystem", "preInit", "Performing Tavik system initialization", sProcess},
        {1, "-H-", ".//TavikSystem", "preInit", "Assertion [ pQrvSensorDir!=NULL ] failed", sAgent},
        {64, "-I-", ".//TavikSystem", "preInit", "Creating instance manager", sProcess},
        {64, "-I-", ".//TavikSystem", "preInit", "Creating Version...", sProcess},
        {128, "-T-", ".//TavikSystem", "sCreateRtdir", "Trying to create '%s'", sProcess},
        {16, "-W-", ".//TavikSystem", "sCreateRtdir", "'%s' already exists... continuing", sAgent},
        {64, "-I-", ".//TavikSystem", "init", "Performing Tavik system data initialization", sAgent},
        {16, "-W-", ".//SensorDirectory", "warnOfSharedDirectory",
         "The sensor directory '%s' can be written by %s, who can so command this agent and replace its files; to make "
         "it private: %s",
         sAgent},
        {16, "-W-", ".//TavikSystem", "sWarnOfStatusPage",
         "The status page is missing or has no boards, the agent works without its counts: %s", sAgent},
        {16, "-W-", ".//Bell", "open", "The sensor is not rung for: %s='%s' cannot be used, %s", sAgent},
        {8, "-E-", ".//KindStates", "sSayNotShown", "The status page lacks a report of Libkpm: %s", sProcess},
        {64, "-I-", ".//TavikSystem", "initConditionals", "Creating HeartbeatHandler Conditional...", sAgent},
        {64, "-I-", ".//TavikSystem", "initConditionals", "Creating CommandHandler Conditional...", sAgent},
        {128, "-T-", ".//TavikSystem", "initCommandIpc", "Creating Tavik Command Reader IPC...", sAgent},
        {128, "-T-", ".//TavikSystem", "initCommandIpc", "Opening Tavik Command Reader IPC...", sAgent},
        {64, "-I-", ".//TavikSystem", "initOutputIpc", "Creating Output IPC...", sAgent},
        {128, "-T-", ".//TavikSystem", "initOutputIpc", "Opening Response Pipe Writer Server...", sAgent},
        {128, "-T-", ".//TavikSystem", "initTavikHandlers", "Creating Tavik Protocol Handler...", sAgent},
        {128, "-T-", ".//TavikSystem", "initTavikHandlers", "Creating Scope Event Catalogue...", sAgent},
        {1, "-H-", ".//TavikSystem", "initThreadComponents", "Assertion [ lpSystem != __null ] failed", sProcess},
        {32, "-N-", ".//TavikSystem", "initHeartbeatHandler",
         "Creating the Heartbeat Handler Thread object...Timeout = %u", sAgent},
        {64, "-I-", ".//TavikSystem", "initCommandHandler", "Creating Command Handler Thread object...", sAgent},
        {128, "-T-", ".//TavikSystem", "destroy", "Performing common system data destruction", sAgent},
        {64, "-I-", ".//TavikSystem", "destroyCommandIpc", "Closing and Destroying Command Pipe...", sAgent},
        {64, "-I-", ".//TavikSystem", "destroyOutputIpc", "Closing and Destroying Output Pipe...", sAgent},
        {128, "-T-", ".//TavikSystem", "postDestroy", "Performing common system destruction", sAgent},
        {64, "-I-", ".//TavikSystem", "setCmdLineArgDescs", "Setting Command line argument descs", sProcess},
        {32, "-N-", ".//TavikSystem", "initLibkpm", "No Libkpm Found or Disabled.. Tavik would exit", sAgent},
        {32, "-N-", ".//TavikSystem", "initLibkpm", "No QRV Adapters found.. Tavik would exit", sAgent},
        {32, "-N-", ".//TavikSystem", "initLibkpm", "Old incompatible driver found.. Tavik would exit", sAgent},
        {32, "-N-", ".//TavikSystem", "initLibkpm", "Discovered QRV initiator <%s, %s>", sAgent},
        {32, "-N-", ".//TavikSystem", "addFcTarget", "Registered Target <%s, %s, %u>", sAgent},
        {32, "-N-", ".//TavikSystem", "addWwpnTarget", "Added Target <%s, %s, %u> to Wwpn Target Map", sAgent},
        {32, "-N-", ".//TavikSystem", "isTotalLimitOnScopeDataReached", "Current size = %u", sAgent},
        {8, "-E-", ".//PendingRecord", "filePrevScopeRecord",
         "Dropping the pending scope record of board %u: the board has no record list any more", sProcess},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ElsPlogi ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ElsPrlo ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ElsAdisc ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ElsLsrjt ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ElsLogo ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ElsRscn ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting FabricFbsy ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting FabricPbsy ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting FabricFcprdchkerr ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ScsiQfull ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ScsiDevbsy ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ScsiCheckcondition ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ScsiLunreset ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ScsiTgtreset ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ScsiBusreset ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting ScsiVarquedepth ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting BoardPortinterr ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting BoardLinkatte ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting BoardTemperature ScopeEvent into Events Catalogue", sAgent},
        {64, "-I-", ".//TavikEventCatalogue", "ZTCTavikEventCatalogue",
         "Inserting AdapterArrival ScopeEvent into Events Catalogue", sAgent},
        {128, "-T-", ".//TavikCore", "ScopeCb_Generic",
         "Invoking Generic callback with boardId: %u, hba wwn: %s, Cat: %u, subCat: %u", sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_Generic", "Ignoring the event as Scope data Collection is not enabled.",
         sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_Generic", "Ignoring the event as the limit on the total Event Data",
         sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_Generic", "Ignoring the KpmLink event callback as boardid %d is bad",
         sAgent},
        {8, "-E-", ".//TavikCore", "ScopeCb_Generic", "Error: %s, processing event callback", sProcess},
        {128, "-T-", ".//TavikCore", "ScopeCb_KpmTemp", "Invoking TEMPERATURE callback with boardId: %u", sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmTemp", "Ignoring the event as Scope data Collection is not enabled.",
         sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmTemp", "Ignoring the event as the limit on the total Event Data",
         sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmTemp", "Ignoring the KpmTemp event callback as boardid %d is bad",
         sAgent},
        {8, "-E-", ".//TavikCore", "ScopeCb_KpmTemp", "Error: %s, processing event callback", sProcess},
        {128, "-T-", ".//TavikCore", "ScopeCb_KpmLink", "Invoking LINK callback with boardId: %u", sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmLink", "Ignoring the event as Scope data Collection is not enabled.",
         sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmLink", "Ignoring the event as the limit on the total Event Data",
         sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmLink", "Ignoring the KpmLink event callback as boardid %d is bad",
         sAgent},
        {8, "-E-", ".//TavikCore", "ScopeCb_KpmLink", "Error: %s, processing event callback", sProcess},
        {128, "-T-", ".//TavikCore", "ScopeCb_KpmRscn", "Invoking RSCN callback with boardId: %u", sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmRscn", "Ignoring the event as Scope data Collection is not enabled.",
         sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmRscn", "Ignoring the event as the limit on the total Event Data",
         sAgent},
        {32, "-N-", ".//TavikCore", "ScopeCb_KpmRscn", "Ignoring the KpmRscn event callback as boardid %d is bad",
         sAgent},
        {8, "-E-", ".//TavikCore", "ScopeCb_KpmRscn", "Error: %s, processing event callback", sProcess},
        {128, "-T-", ".//TavikCore", "ScopeCb_Generic", "Data = %p", sAgent},
        {8, "-E-", ".//TavikCore", "sProcessScopeEvent",
         "Bad boardid %d in event has been recieved. Event: wwn %s; cat %d; subcat %d.  Skip event!", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidatePlogiEvents", "Processing PLOGI event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidatePrloEvents", "Processing PRLO event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateAdiscEvents", "Processing ADISC event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateLogoEvents", "Processing LOGO event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidatePbsyEvents", "Processing PORTBUSY event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateLsRjtEvents", "Processing LsRjt Event Category=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateFcprdChkErrEvents", "Processing FCPRDCHKERR event Cat=%u SubCat=%u",
         sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateLunResetEvents", "Processing LUN RESET Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateTargetResetEvents", "Processing TGT RESET Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateVarQDepthEvents", "Processing VARQDEPTH event Cat=%u SubCat=%u",
         sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateQFullEvents", "Processing QFULL event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateDevBsyEvents", "Processing DEVBSY event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateCheckCondEvents", "Processing CHECKCOND event Cat=%u SubCat=%u",
         sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Processing Fabric BUSY event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Processing BUSRESET event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Processing PORTINTERR event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Processing LINK event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Processing TEMP event Cat=%u SubCat=%u", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Processing ADAPTER ARRIVAL Event Cat=%u SubCat=%u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in ELS PLOGI Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in ELS PRLO Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in ELS ADISC Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in ELS LSRJT Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in ELS LOGO Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in FCPRDCHECKERR event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in SCSI Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in SCSI CHECKCOND Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in SCSI TGTRESET Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough data in SCSI VARQUEDEPTH Event %u %u", sAgent},
        {16, "-W-", ".//TavikCore", "sConsolidateEvents", "Not enough event data in FABRIC PORT BUSY event%u %u",
         sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Unknown ELS Event subcategory = %u, ignored", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Unknown Fabric Event subcategory=%u, ignored", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Unknown Scsi Event subcategory = %u, ignored", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Unknown Board Evt catgory=%u subcatgory=%u ignored", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Unknown Adapter Evt catgory=%u subcatgory=%u ignored",
         sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateEvents", "Unknown Category = %u SubCategory = %u, ignored", sAgent},
        {16, "-W-", ".//TavikCore", "sProcessRscnEvent", "Not enough data in RSCN Event %u %u", sAgent},
        {64, "-I-", ".//TavikCore", "sProcessRscnEvent", "Got an RSCN event: datalength:%u", sAgent},
        {32, "-N-", ".//TavikCore", "sProcessRscnEvent", "No Payload in RSCN Event", sAgent},
        {64, "-I-", ".//TavikCore", "sProcessRscnEvent", "lPayloadLength = %hu", sAgent},
        {32, "-N-", ".//TavikCore", "sConsolidateRscnEvent", "Processing Rscn Event Cat=%u SubCat=%u", sAgent},
        {1, "-H-", ".//TavikCommandHandler", "CommandHandlerThreadProcedure", "Assertion [ 0 != lpArgs ] failed",
         sProcess},
        {1, "-H-", ".//TavikCommandHandler", "CommandHandlerThreadProcedure", "Assertion [ 0 != lpTavikSystem ] failed",
         sProcess},
        {1, "-H-", ".//TavikCommandHandler", "CommandHandlerThreadProcedure",
         "Assertion [ 0 != lCommandHandler ] failed", sProcess},
        {64, "-I-", ".//TavikCommandHandler", "CommandHandlerThreadProcedure", "Waiting for control availability...",
         sAgent},
        {64, "-I-", ".//TavikCommandHandler", "CommandHandlerThreadProcedure",
         "Command handler thread is set for exit ...", sAgent},
        {1, "-H-", ".//TavikCommandHandler", "CommandHandlerThreadProcedure",
         "Exiting TavikCommandHnadler thread (thread-only): %s", sProcess},
        {1, "-H-", ".//TavikCommandHandler", "CommandHandlerThreadProcedure",
         "Exiting TavikCommandHandler thread with error : %s", sAgent},
        {1, "-H-", ".//TavikProtocolHandler", "ZTCTavikProtocolHandler",
         "Assertion [ __null != this->mpTavikSystem ] failed", sProcess},
        {128, "-T-", ".//TavikProtocolHandler", "process", "Command to handle: %u", sAgent},
        {1, "-H-", ".//TavikProtocolHandler", "process", "Assertion [ false ] failed", sAgent},
        {1, "-H-", ".//TavikProtocolHandler", "handleStartScopeCommand",
         "Assertion [ lType == ZTSTVKC_StartScope ] failed", sProcess},
        {32, "-N-", ".//TavikProtocolHandler", "handleStartScopeCommand",
         "ScopeEvents Already Registered. Hence Starting ScopeData Collection.", sAgent},
        {8, "-E-", ".//TavikProtocolHandler", "handleStartScopeCommand",
         "Failed to register event (%u, %u) for Initiator <%s, %s> - Error %u", sAgent},
        {32, "-N-", ".//TavikProtocolHandler", "handleStartScopeCommand",
         "Registered event (%u, %u) for Initiator <%s, %s>", sAgent},
        {8, "-E-", ".//TavikProtocolHandler", "handleStartScopeCommand",
         "Failed to register RSCN for Initiator <%s, %s> - Error %u", sAgent},
        {16, "-W-", ".//TavikProtocolHandler", "handleStartScopeCommand",
         "Failed to register TEMPERATURE for Initiator <%s, %s> - Error %u", sAgent},
        {8, "-E-", ".//TavikProtocolHandler", "handleStartScopeCommand",
         "Failed to register LINK for Initiator <%s, %s> - Error %u", sAgent},
        {32, "-N-", ".//TavikProtocolHandler", "handleStartScopeCommand", "Registered RSCN for Initiator <%s, %s>",
         sAgent},
        {32, "-N-", ".//TavikProtocolHandler", "handleStartScopeCommand",
         "Registered Temperature Event for Initiator <%s, %s>", sAgent},
        {32, "-N-", ".//TavikProtocolHandler", "handleStartScopeCommand", "Registered LINK for Initiator <%s, %s>",
         sAgent},
        {128, "-T-", ".//TavikProtocolHandler", "handleStartScopeCommand", "Ignore other events for now", sProcess},
        {1, "-H-", ".//TavikProtocolHandler", "handleGetScopeDataCommand",
         "Assertion [ lType == ZTSTVKC_GetScopeData ] failed", sProcess},
        {8, "-E-", ".//TavikProtocolHandler", "handleGetScopeDataCommand",
         "Bad boardid %d detected during handle GetScopeDataCommand command", sAgent},
        {32, "-N-", ".//TavikProtocolHandler", "handleGetScopeDataCommand", "Wrote <%u> Scope records from record-list",
         sAgent},
        {32, "-N-", ".//TavikProtocolHandler", "handleGetScopeDataCommand", "Wrote total <%u> Scope Events", sAgent},
        {32, "-N-", ".//TavikProtocolHandler", "handleStopCommand", "Stopping Scope Data Collection.", sAgent},
        {8, "-E-", ".//TavikProtocolHandler", "handleUnregisterEvents",
         "Bad event keyform %d has beed detected in map of registered events", sProcess},
        {16, "-W-", ".//TavikProtocolHandler", "handleUnregisterEvents",
         "Failed to Unregister event (%u, %u) for Initiator <%s, %s> - Error %u", sProcess},
        {32, "-N-", ".//TavikProtocolHandler", "handleUnregisterEvents",
         "Successfully Unregistered event (%u, %u) for Initiator <%s, %s> ", sProcess},
        {1, "-H-", ".//TavikProtocolHandler", "handleRegisterTargetsCommand",
         "Assertion [ ZTSTVKC_RegisterTargets == lType ] failed", sProcess},
        {1, "-H-", ".//TavikProtocolHandler", "handleSetCollectionPeriodCommand",
         "Assertion [ ZTSTVKC_CollectionPeriod == lType ] failed", sProcess},
        {32, "-N-", ".//TavikProtocolHandler", "handleSetCollectionPeriodCommand", "The limit set is %u", sAgent},
        {128, "-T-", ".//TavikProtocolHandler", "createFailedResponse", "Creating Failed Response...", sAgent},
        {8, "-E-", "tavik/include/TavikInitiator", "addRegEvent",
         "addRegEvent FAILED due duplicated keyform %d has been detected", sAgent},
        {1, "-H-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread", "Assertion [ 0 != lpArgs ] failed", sProcess},
        {2, "-A-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread",
         "Dynamic cast of base class failed, error. Exiting the thread abnormally.", sProcess},
        {128, "-T-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread", "Going to wait for %u seconds", sAgent},
        {1, "-H-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread",
         "Exiting Heartbeat Handler Thread as it is marked for exit.", sAgent},
        {128, "-T-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread", "Updating the status", sAgent},
        {1, "-H-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread", "Failed in updating the status", sAgent},
        {128, "-T-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread", "Checking the status of Sensor", sAgent},
        {32, "-N-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread",
         "Checking the status of the actual sensor process/service", sAgent},
        {32, "-N-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread",
         "Sensor process still running, but not updating the heartbeat", sAgent},
        {1, "-H-", ".//TavikHeartbeatHandler", "TavikHeartbeatThread", "Failed in getting the status of Sensor",
         sAgent},
        {128, "-T-", ".//SetHeartbeat", "SetHeartbeat", "Setting the mod time of %s", sAgent},
        {16, "-W-", ".//CheckHeartbeat", "CheckStatus", "Failed in stat on %s file", sAgent},
        {16, "-W-", ".//CheckHeartbeat", "CheckStatus", "Modfication time of the %s hasn't changed", sAgent},
        {8, "-E-", "sensor/agentcommon/src/LibkpmAbs", "sWriteLibraryLine", "Libkpm: %s", sAgent},
        {32, "-N-", "sensor/agentcommon/src/LibkpmAbs", "sWriteLibraryLine", "Libkpm: %s", sAgent},
        {64, "-I-", "sensor/agentcommon/src/LibkpmAbs", "sWriteLibraryLine", "Libkpm: %s", sAgent},
        {16, "-W-", "sensor/agentcommon/src/LibkpmAbs", "sWriteLibraryLine", "Libkpm: %s", sAgent},
        {16, "-W-", "sensor/agentcommon/src/LibkpmAbs", "LIBKPM_LoadLibrary", "Libkpm is disabled: %s is set and empty",
         sAgent},
        {16, "-W-", "sensor/agentcommon/src/LibkpmAbs", "LIBKPM_LoadLibrary", "Libkpm '%s' cannot be loaded: %s",
         sAgent},
        {16, "-W-", "sensor/agentcommon/src/LibkpmAbs", "LIBKPM_LoadLibrary", "Libkpm '%s' cannot be used: %s", sAgent},
        {128, "-T-", "system/include/System", "ZTCSystem", "Entered", sProcess},
        {128, "-T-", "system/include/System", "ZTCSystem", "Left", sProcess},
        {1, "-H-", "system/include/System", "getReader",
         "Assertion [ acReaderNo < this->mReaders.numberOfElements() ] failed", sProcess},
        {1, "-H-", "system/include/System", "getWriter",
         "Assertion [ acWriterNo < this->mWriters.numberOfElements() ] failed", sProcess},
        {1, "-H-", "system/src/System", "sRunGuarded", "Thread '%s' ends with an exception: %s (code %u)", sProcess},
        {1, "-H-", "system/src/System", "sRunGuarded", "Thread '%s' ends with a foreign exception: %s", sProcess},
        {1, "-H-", "system/src/System", "sRunGuarded", "Thread '%s' ends with an unknown exception", sProcess},
        {8, "-E-", "system/src/System", "processCommandLine", "%s", sAgent},
        {1, "-H-", "system/src/System", "startThreads", "Starting the threads failed: %s; those that run are stopped",
         sProcess},
        {8, "-E-", "system/src/System", "processCommandLineArguments", "The running instance cannot be stopped: %s",
         sAgent},
        {8, "-E-", "system/src/SystemGlobals", "sRefuseToRunTwice", "%s", sAgent},
        {8, "-E-", "system/src/SystemGlobals", "sTakeSaidSteps", "%s ends: %s", sAgent},
        {8, "-E-", "system/src/SystemGlobals", "attempt", "Giving up the run: %s; going on", sProcess},
        {1, "-H-", "system/src/SignalWaiter", "waitForSignals",
         "Waiting for signals failed: %s; the process is stopped", sProcess},
        {32, "-N-", "system/src/SignalWaiter", "takeSignals", "Signal %u from process %u: the log file is reopened",
         sAgent},
        {32, "-N-", "system/src/SignalWaiter", "takeSignals", "The log file was reopened", sAgent},
        {32, "-N-", "system/src/SignalWaiter", "takeSignals", "Signal %u from process %u: stopping", sAgent},
        {256, "-PROT-", "", "", "%s %s", sAgent},
        {128, "-T-", "system/src/SynchList", "~ZTCSynchList", "Ignoring '%s'", sProcess},
        {16, "-W-", "system/src/ProcessInstanceManager", "exitInstanceManagement",
         "The pid file '%s' is gone or another's; nothing is removed", sAgent},
        {16, "-W-", "os/common/src/NamedPipe", "sWarnOfSharedFifo",
         "The FIFO '%s' was there already, with owner %u and mode %s: whoever may open it can talk in the place of the "
         "sensor or the agent; to have it made anew, stop the agent and remove it",
         sAgent},
        {64, "-I-", "os/common/src/NamedPipe", "create", "The FIFO '%s' is there already and is taken over", sAgent},
        {32, "-N-", "os/common/src/NamedPipe", "openForWriting", "Waiting for a reader of '%s'", sAgent},
        {32, "-N-", "os/common/src/NamedPipe", "openForWriting", "%s", sAgent},
        {16, "-W-", "os/common/src/NamedPipe", "destroy", "'%s' is %s now, not a FIFO; it is left where it is", sAgent},
        {8, "-E-", "os/common/src/NamedPipe", "discardBrokenFrame",
         "A message of %u bytes on '%s' is refused, its length has to be 1 to %u; %zu bytes behind it are thrown away",
         sAgent},
        {8, "-E-", "os/common/src/NamedPipe", "discardPartialFrame",
         "A message on '%s' broke off after %u of %" PRIu64 " bytes, its length included; it is thrown away", sAgent},
        {128, "-T-", "os/common/include/Mutex", "~ZTCMutex", "Ignoring exception in Mutex destruction ...", sProcess},
        {128, "-T-", "os/common/include/Conditional", "~ZTCConditional", "Ignoring exceptions while destructing ...",
         sProcess},
        {16, "-W-", "common/src/LogSink", "sSayOnStandardError", "%s '%s': %s: %s", sAgent},
        {16, "-W-", "common/src/LogSink", "reopen",
         "Cannot open the log file '%s' anew (%s): lines go on into the former one until it can be opened", sAgent},
        {16, "-W-", "common/src/LogSink", "reportLostLines",
         "%llu log lines could not be written to '%s' and went to standard error: %s", sAgent},
        {8, "-E-", "common/include/Map", "insert", "Element already existed in the map", sAgent},
        {64, "-I-", "common/include/Map", "get", "Element does not exist in the map", sAgent},
        {1, "-H-", "common/include/Pointer", "ZTCPointer", "Assertion [ 0 != acrCopy.mPointer ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "ZTCPointer", "Assertion [ 0 != acrCopy.mReferenceCount ] failed",
         sProcess},
        {1, "-H-", "common/include/Pointer", "operator=", "Assertion [ 0 != acrCopy.mPointer ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "operator=", "Assertion [ 0 != acrCopy.mReferenceCount ] failed",
         sProcess},
        {1, "-H-", "common/include/Pointer", "ZTCPointer", "Assertion [ ZTPST_Individual == acrCopy.mSizeType ] failed",
         sProcess},
        {1, "-H-", "common/include/Pointer", "operator->", "Assertion [ 0 != mPointer ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "operator->", "Assertion [ 0 != mReferenceCount ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "operator*", "Assertion [ 0 != mPointer ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "operator*", "Assertion [ 0 != mReferenceCount ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "get", "Assertion [ 0 != mPointer ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "get", "Assertion [ 0 != mReferenceCount ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "operator->", "Assertion [ ZTPST_Individual == mSizeType ] failed",
         sProcess},
        {1, "-H-", "common/include/Pointer", "operator*", "Assertion [ false ] failed", sProcess},
        {1, "-H-", "common/include/Pointer", "_releaseMemory", "Assertion [ false ] failed", sProcess},
        {1, "-H-", "common/src/String", "ZTCString", "Assertion [ acrCopy.mString != 0 ] failed", sProcess},
        {1, "-H-", "common/src/String", "operator=", "Assertion [ acrCopy.mString != 0 ] failed", sProcess},
        {1, "-H-", "common/src/String", "get", "Assertion [ mString != 0 ] failed", sProcess},
        {1, "-H-", "common/src/String", "length", "Assertion [ mString != 0 ] failed", sProcess},
        {1, "-H-", "common/src/String", "operator==", "Assertion [ mString != 0 ] failed", sProcess},
        {1, "-H-", "common/src/String", "operator<", "Assertion [ mString != 0 ] failed", sProcess},
        {1, "-H-", "common/src/String", "operator+", "Assertion [ mString != 0 ] failed", sProcess},
        {1, "-H-", "common/src/String", "operator==", "Assertion [ acrCopy.mString != 0 ] failed", sProcess},
        {1, "-H-", "common/src/String", "operator+", "Assertion [ acrOther.mString != 0 ] failed", sProcess},
    };
    return srTexts;
}

static bool sFits(const std::string& acrText, std::size_t aFrom, const std::string& acrFormat, std::size_t aFormatFrom);

/// Whether the rest fits behind any text of at most `aMost` characters.
static bool sFitsAfter(const std::string& acrText, std::size_t aFrom, std::size_t aMost, const std::string& acrFormat,
                       std::size_t aFormatFrom) {
    for (std::size_t lLength = aMost + 1; lLength-- > 0;) {
        if (sFits(acrText, aFrom + lLength, acrFormat, aFormatFrom)) {
            return true;
        }
    }
    return false;
}

/// Whether the text from here on is of the format from there on.
static bool sFits(const std::string& acrText, std::size_t aFrom, const std::string& acrFormat,
                  std::size_t aFormatFrom) {
    while (aFormatFrom < acrFormat.size() && acrFormat[aFormatFrom] != '%') {
        if (aFrom == acrText.size() || acrText[aFrom] != acrFormat[aFormatFrom]) {
            return false;
        }
        ++aFrom;
        ++aFormatFrom;
    }
    if (aFormatFrom == acrFormat.size()) {
        return aFrom == acrText.size();
    }
    const std::size_t lConversion = acrFormat.find_first_of("sudp", aFormatFrom);
    const std::size_t lNext = lConversion + 1;
    if (acrFormat[lConversion] == 's') {
        return sFitsAfter(acrText, aFrom, acrText.size() - aFrom, acrFormat, lNext);
    }
    std::size_t lEnd = aFrom;
    if (acrFormat[lConversion] == 'p') {
        lEnd = acrText.find_first_of(" ,;", aFrom);
        lEnd = lEnd == std::string::npos ? acrText.size() : lEnd;
        return lEnd != aFrom && sFits(acrText, lEnd, acrFormat, lNext);
    }
    if (acrFormat[lConversion] == 'd' && lEnd < acrText.size() && acrText[lEnd] == '-') {
        ++lEnd;
    }
    const std::size_t lDigits = lEnd;
    while (lEnd < acrText.size() && std::isdigit(static_cast<unsigned char>(acrText[lEnd])) != 0) {
        ++lEnd;
    }
    return lEnd != lDigits && sFits(acrText, lEnd, acrFormat, lNext);
}

bool isOfFormat(const std::string& acrText, const std::string& acrFormat) {
    return sFits(acrText, 0, acrFormat, 0);
}

void ZTCLogTextsSeen::add(const std::vector<std::string>& acrRawLines) {
    using ZTCPlace = std::tuple<std::string, std::string, std::string>;
    static const auto& srByPlace = *[] {
        auto* const lpByPlace = new std::multimap<ZTCPlace, std::size_t>;
        for (std::size_t lRow = 0; lRow < logTexts().size(); ++lRow) {
            const ZTSLogText& lcrRow = logTexts()[lRow];
            lpByPlace->emplace(ZTCPlace(lcrRow.mpMark, lcrRow.mpLabel, lcrRow.mpFunction), lRow);
        }
        return lpByPlace;
    }();
    for (const std::string& lcrRawLine : acrRawLines) {
        ZTSLogLine lLine;
        if (const auto lParsed = parseLogLine(lcrRawLine)) {
            lLine = *lParsed;
        } else {
            const std::size_t lBlank = lcrRawLine.find(' ');
            lLine.mMark = lcrRawLine.substr(0, lBlank);
            lLine.mText = lBlank == std::string::npos ? "" : lcrRawLine.substr(lBlank + 1);
        }
        bool lIsKnown = lLine.mMark == "-T-" && (lLine.mText == "Entered" || lLine.mText == "Left");
        const auto [lBegin, lEnd] = srByPlace.equal_range(ZTCPlace(lLine.mMark, lLine.mLabel, lLine.mFunction));
        for (auto lRow = lBegin; lRow != lEnd; ++lRow) {
            if (isOfFormat(lLine.mText, logTexts()[lRow->second].mpFormat)) {
                mSeen.insert(lRow->second);
                lIsKnown = true;
            }
        }
        if (!lIsKnown) {
            mStrangers.insert(lLine.mMark + " " + lLine.mLabel + " " + lLine.mFunction + ": " + lLine.mText);
        }
    }
}

std::vector<std::string> ZTCLogTextsSeen::unseen(ZTELogTextPath aPath) const {
    std::vector<std::string> lUnseen;
    for (std::size_t lRow = 0; lRow < logTexts().size(); ++lRow) {
        const ZTSLogText& lcrRow = logTexts()[lRow];
        if (lcrRow.mPath == aPath && mSeen.count(lRow) == 0) {
            lUnseen.push_back(std::string(lcrRow.mpMark) + " " + lcrRow.mpLabel + " " + lcrRow.mpFunction + ": " +
                              lcrRow.mpFormat);
        }
    }
    return lUnseen;
}
