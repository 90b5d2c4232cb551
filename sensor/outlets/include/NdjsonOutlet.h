/// The file of JSON lines as an outlet.
#ifndef SENSOR_OUTLETS_INCLUDE_NDJSONOUTLET_H
#define SENSOR_OUTLETS_INCLUDE_NDJSONOUTLET_H

#include "sensor/outlets/include/ChangeOutlet.h"
#include "sensor/outlets/include/NdjsonFile.h"

class ZTCNdjsonOutlet : public ZTCChangeOutlet {
public:
    /// As ZTCNdjsonFile.
    ZTCNdjsonOutlet(const std::string& acrPath, std::uint64_t aMostBytes, std::uint64_t aKeep)
        : mFile(acrPath, aMostBytes, aKeep) {}

    const char* getTitle() const override { return "the file of JSON lines"; }
    const char* getName() const override { return "ndjson"; }
    void write(std::span<const ZTSOutletChange> aChanges) override {
        std::string lLines;
        for (const ZTSOutletChange& lrChange : aChanges) {
            lLines += lrChange.mLine + "\n";
        }
        mFile.append(lLines);
    }
    void writeMissed(std::uint64_t, const std::string& acrLine) override { mFile.append(acrLine + "\n"); }

private:
    ZTCNdjsonFile mFile;
};

#endif
