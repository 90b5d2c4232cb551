/// Prints episodes, records or ports one by one: as rows of a table that stays aligned, or as the elements of one JSON
/// document. Nothing is collected in memory but some hundred rows.
#ifndef SENSOR_TAVIK_SRC_EPISODEPRINTER_H
#define SENSOR_TAVIK_SRC_EPISODEPRINTER_H

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "sensor/views/include/TextTable.h"

/// A JSON document with one list whose elements are printed as they come, a line each.
class ZTCDocumentPrinter {
public:
    /// @param acrHead  the members in front of the list
    ZTCDocumentPrinter(const nlohmann::ordered_json& acrHead, const std::string& acrListName);
    void print(const nlohmann::ordered_json& acrElement);
    void finish();

private:
    bool mIsFirst = true;
};

/// A table that is printed some hundred rows at a time.
class ZTCTablePrinter {
public:
    explicit ZTCTablePrinter(ZTCTextTable aTable) : mTable(std::move(aTable)) {}
    ZTCTextTable& getTable() { return mTable; }
    /// After each row.
    void printIfMany();
    /// Prints what there is. Returns whether any row was printed so far.
    bool finish();

private:
    ZTCTextTable mTable;
    bool mHasPrinted = false;
};

#endif
