#include <map>
#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordJson.h"
#include "sensor/tavik/src/Context.h"
#include "sensor/tavik/src/EpisodePrinter.h"
#include "sensor/tavik/src/HistoryWatch.h"
#include "sensor/tavik/src/Terminal.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/EpisodeText.h"

/// Rows where nothing else is asked for; JSON has all.
static constexpr std::uint64_t scDefaultLimit = 100;

/// Episodes, or raw records.
class ZTCEventsCommand {
public:
    explicit ZTCEventsCommand(const ZTSTavikOptions& acrOptions)
        : mrOptions(acrOptions),
          mContext(acrOptions),
          mTable(acrOptions.mIsRecords ? makeRecordTable(getTableWidth()) : makeEpisodeTable(getTableWidth())) {}

    int run() {
        checkFilter(mrOptions.mFilter);
        return mrOptions.mIsFollow ? follow() : printOnce();
    }

private:
    const char* listName() const { return mrOptions.mIsRecords ? "records" : "episodes"; }
    std::uint64_t defaultLimit() const { return mrOptions.mIsJson ? 0 : scDefaultLimit; }
    nlohmann::ordered_json head() const { return beginDocument("events", mContext.getHost(), mpHistory->getStoreId()); }

    /// Throws what ZTCHistory throws, and ZTCBadFilterEx.
    void open() {
        mpHistory = mContext.openHistory();
        mNames = mContext.makeNames(mpHistory.get());
        mFilter = readFilter(mrOptions.mFilter, mNames, mpHistory->readMarks(), getHistoryTime(), defaultLimit());
    }

    /// Calls one of the two with each match, oldest first.
    template <class ZTCVisitor>
    void visit(const ZTCVisitor& acrVisitor) const {
        const auto lVisit = [&acrVisitor](const auto& acrItem) {
            acrVisitor(acrItem);
            return true;
        };
        if (mrOptions.mIsRecords) {
            mpHistory->visitRecords(mFilter, lVisit);
        } else {
            mpHistory->visitEpisodes(mFilter, lVisit);
        }
    }

    void addTableRow(const ZTSEpisode& acrEpisode) { addRow(mTable.getTable(), acrEpisode, mNames, getHistoryTime()); }
    void addTableRow(const ZTSStoredRecord& acrRecord) { addRow(mTable.getTable(), acrRecord, mNames); }

    int printOnce() {
        open();
        if (mrOptions.mIsJson) {
            ZTCDocumentPrinter lPrinter(head(), listName());
            visit([&](const auto& acrItem) { lPrinter.print(toJson(acrItem, mNames)); });
            lPrinter.finish();
            return ZTTX_Done;
        }
        visit([&](const auto& acrItem) {
            addTableRow(acrItem);
            mTable.printIfMany();
        });
        if (!mTable.finish()) {
            writeOutput(std::string("No ") + (mrOptions.mIsRecords ? "record" : "episode") + " matches.\n");
            sayWhetherSilenceCounts();
        }
        return ZTTX_Done;
    }

    /// That nothing is shown proves something only where Tavik hears everything.
    void sayWhetherSilenceCounts() const {
        const ZTSStatusFacts lFacts = mContext.gatherFacts();
        const ZTSJudgement lJudgement = judge(lFacts);
        if (lJudgement.getExit() != ZTTX_Done) {
            writeOutput(formatHeadline(lFacts, lJudgement, false) + ": tavik status\n");
        }
    }

    /// One match that is new: a row, or a document of its own on one line.
    template <class ZTCItem>
    void printNow(const ZTCItem& acrItem) {
        if (mrOptions.mIsJson) {
            nlohmann::ordered_json lDocument = head();
            lDocument[listName()] = nlohmann::ordered_json::array({toJson(acrItem, mNames)});
            writeOutput(dumpJson(lDocument, -1) + "\n");
        } else {
            addTableRow(acrItem);
        }
    }

    int follow() {
        ZTCHistoryWatch lWatch(mContext.getSettings().mSensorState);
        bool lHasSaidWaiting = false;
        for (;; lWatch.wait()) {
            try {
                if (lWatch.isReplaced()) {
                    mpHistory.reset();
                }
                if (mpHistory == nullptr) {
                    open();
                    printWhatThereIs();
                }
                printChanges();
            } catch (const ZTCNoHistoryEx& lrEx) {
                mpHistory.reset();
                if (!lHasSaidWaiting) {
                    complain(std::string(lrEx.what()) + "; waiting for it");
                    lHasSaidWaiting = true;
                }
            }
        }
    }

    void printWhatThereIs() {
        mFilter.mAfterSeq = mpHistory->getLastSeq();
        const std::uint64_t lAfter = std::exchange(mFilter.mAfterSeq, 0);
        mPrinted.clear();
        visit([&](const auto& acrItem) {
            printNow(acrItem);
            mPrinted[acrItem.mEpisode] = acrItem.mSeq;
            mTable.printIfMany();
        });
        mTable.finish();
        mFilter.mAfterSeq = lAfter;
        mFilter.mLimit = 0;
    }

    /// Prints what has changed since the last call, and moves the filter's number on.
    void printChanges() {
        const std::uint64_t lLast = mpHistory->getLastSeq();
        if (lLast == mFilter.mAfterSeq) {
            return;
        }
        std::uint64_t lSeen = mFilter.mAfterSeq;
        const auto lPrint = [&](const auto& acrItem) {
            lSeen = std::max(lSeen, acrItem.mSeq);
            const auto lPrinted = mPrinted.find(acrItem.mEpisode);
            if (lPrinted == mPrinted.end() || lPrinted->second < acrItem.mSeq) {
                printNow(acrItem);
            }
            mTable.printIfMany();
            return true;
        };
        if (mrOptions.mIsRecords) {
            mpHistory->visitRecords(mFilter, lPrint);
        } else {
            mpHistory->visitChanges(mFilter, lPrint);
        }
        mTable.finish();
        // Changes that did not match are behind us too.
        mFilter.mAfterSeq = std::max(lSeen, lLast);
        mPrinted.clear();
    }

    const ZTSTavikOptions& mrOptions;
    const ZTCContext mContext;
    std::unique_ptr<ZTCHistory> mpHistory;
    ZTCNameBook mNames;
    ZTSHistoryFilter mFilter;
    ZTCTablePrinter mTable;
    std::map<std::uint64_t, std::uint64_t> mPrinted;  ///< episode to the newest number that was printed of it
};

int runEvents(const ZTSTavikOptions& acrOptions) {
    return ZTCEventsCommand(acrOptions).run();
}

int runPorts(const ZTSTavikOptions& acrOptions) {
    checkFilter(acrOptions.mFilter);
    const ZTCContext lContext(acrOptions);
    const std::unique_ptr<ZTCHistory> lpHistory = lContext.openHistory();
    const ZTCNameBook lNames = lContext.makeNames(lpHistory.get());
    const ZTCHistoryTime lNow = getHistoryTime();
    const ZTSHistoryFilter lFilter = readFilter(acrOptions.mFilter, lNames, lpHistory->readMarks(), lNow, 0);
    const std::vector<ZTSPortSummary> lPorts = lpHistory->readPorts(lFilter);
    if (acrOptions.mIsJson) {
        ZTCDocumentPrinter lPrinter(beginDocument("ports", lContext.getHost(), lpHistory->getStoreId()), "ports");
        for (const ZTSPortSummary& lrPort : lPorts) {
            lPrinter.print(toJson(lrPort, lNames));
        }
        lPrinter.finish();
        return ZTTX_Done;
    }
    ZTCTextTable lTable = makePortTable(getTableWidth());
    for (const ZTSPortSummary& lrPort : lPorts) {
        addRow(lTable, lrPort, lNames, lNow);
    }
    writeOutput(lPorts.empty() ? "No remote port has had an event that matches.\n" : lTable.takeText());
    return ZTTX_Done;
}
