/// A history that notes what it is handed.
#ifndef TESTS_UNIT_COLLECTOR_NOTINGHISTORY_H
#define TESTS_UNIT_COLLECTOR_NOTINGHISTORY_H

#include <string>
#include <vector>

#include "sensor/collector/include/HistorySink.h"

class ZTCNotingHistory : public ZTCHistorySink {
public:
    void takeIn(const ZTSSpoolEntry& acrEntry, ZTCPagePointer) override { mFiles.push_back(acrEntry.mName.toText()); }
    void notePage(ZTCPagePointer apPage) override { mPages.push_back(apPage); }
    void endAgent(ZTSEndedAgent aAgent) override { mEnded.push_back(aAgent); }

    std::vector<std::string> mFiles;
    std::vector<ZTCPagePointer> mPages;
    std::vector<ZTSEndedAgent> mEnded;
};

#endif
