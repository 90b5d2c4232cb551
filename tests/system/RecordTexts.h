/// Events of the kinds with data, and the texts of the records that they make.
#ifndef TESTS_SYSTEM_RECORDTEXTS_H
#define TESTS_SYSTEM_RECORDTEXTS_H

#include <string>
#include <vector>

#include "tests/system/AdapterEvents.h"

inline ZTSLibraryEvent eventOf(const ZTSDataKind& acrKind, const ZTCBytes& acrData, unsigned aBoard = 0) {
    return ZTSLibraryEvent::scope(aBoard, acrKind.mCategory, acrKind.mSubcategory, acrData);
}

/// A record as ZTSScopeDataResponse::texts() shows it.
inline std::string recordText(unsigned aCategory, unsigned aSubcategory, unsigned aOccurrences,
                              const std::string& acrHex, const std::string& acrNames = "") {
    return std::to_string(aCategory) + "/" + std::to_string(aSubcategory) + " x" + std::to_string(aOccurrences) + " " +
           acrNames + acrHex;
}

inline std::string recordText(const ZTSDataKind& acrKind, unsigned aOccurrences, const std::string& acrHex,
                              const std::string& acrNames = "") {
    return recordText(acrKind.mCategory, acrKind.mSubcategory, aOccurrences, acrHex, acrNames);
}

using ZTCTexts = std::vector<std::string>;

#endif
