/// The table of the SAN's troubles: id, title, and what to say and do for each. One row a trouble.
#ifndef SENSOR_VIEWS_INCLUDE_SANTROUBLES_H
#define SENSOR_VIEWS_INCLUDE_SANTROUBLES_H

#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/views/include/NameBook.h"
#include "sensor/views/include/SanFacts.h"
#include "sensor/views/include/TroubleText.h"

struct ZTSSanTroubleRow {
    ZTESanTrouble mKind;
    const char* mpId;      ///< stable; as `tavik explain` takes it
    const char* mpTitle;   ///< "PATH LOST"
    const char* mpAction;  ///< commands, or what to do; "PORT" stands for the port that is concerned
    const char* mpMeans;   ///< for `tavik explain`, as the next two
    const char* mpCauses;
    const char* mpLookAt;
};

/// A row for each trouble, the worst first.
std::span<const ZTSSanTroubleRow> getSanTroubleTable();

/// The row of that id, or null.
const ZTSSanTroubleRow* findSanTrouble(std::string_view aId);

const ZTSSanTroubleRow& getSanTroubleRow(ZTESanTrouble aKind);

/// What to do, with a port's name in it, or "the port".
std::string getSanAction(const ZTSSanTroubleRow& acrRow, const std::string& acrPort = "the port");

/// A trouble in words, with status, action and see.
ZTSTroubleText describeSanTrouble(const ZTSSanTrouble& acrTrouble, const ZTSSanFacts& acrFacts,
                                  const ZTCNameBook& acrNames, ZTCHistoryTime aNow);

/// All of them, the worst first. `aLeast`: none below this severity.
std::vector<ZTSTroubleText> describeSanTroubles(const ZTSSanFacts& acrFacts, const ZTCNameBook& acrNames,
                                                ZTCHistoryTime aNow, ZTESanSeverity aLeast = ZTSS_Notice);

/// "96 LUNs, 8 paths each, all running".
std::string summarizePaths(const ZTSSanFacts& acrFacts);

/// The multipath device's name, else the disk of its first path, else the wwid or the address.
std::string describeLun(const ZTSSanLun& acrLun);

#endif
