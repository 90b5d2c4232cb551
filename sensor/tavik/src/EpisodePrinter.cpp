#include "sensor/tavik/src/EpisodePrinter.h"

#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordJson.h"
#include "sensor/tavik/src/Tavik.h"

static constexpr std::size_t scMostRows = 500;

ZTCDocumentPrinter::ZTCDocumentPrinter(const nlohmann::ordered_json& acrHead, const std::string& acrListName) {
    std::string lHead = dumpJson(acrHead, -1);
    lHead.pop_back();
    writeOutput(lHead + ",\"" + acrListName + "\":[");
}

void ZTCDocumentPrinter::print(const nlohmann::ordered_json& acrElement) {
    writeOutput((mIsFirst ? "\n" : ",\n") + dumpJson(acrElement, -1));
    mIsFirst = false;
}

void ZTCDocumentPrinter::finish() {
    writeOutput("\n]}\n");
}

void ZTCTablePrinter::printIfMany() {
    if (mTable.countRows() >= scMostRows) {
        finish();
    }
}

bool ZTCTablePrinter::finish() {
    if (mTable.countRows() != 0) {
        writeOutput(mTable.takeText());
        mHasPrinted = true;
    }
    return mHasPrinted;
}
