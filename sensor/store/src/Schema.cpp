#include "sensor/store/src/Schema.h"

#include <array>
#include <string>

/// Times are microseconds since the epoch. `kind` is category * 256 + subcategory. `port` 0 is no remote port. Numbers
/// named `...Seq` are all drawn from counter.nextSeq. A byte range named `detail` or `data` is described in its codec.
static constexpr const char* scFirstVersion = R"sql(
CREATE TABLE counter(
    id INTEGER PRIMARY KEY CHECK (id = 1),
    storeId TEXT NOT NULL,
    nextSeq INTEGER NOT NULL DEFAULT 1,
    nextEpisode INTEGER NOT NULL DEFAULT 1,
    lastFrame INTEGER NOT NULL DEFAULT 0,
    recordsPerEnd INTEGER NOT NULL DEFAULT 0,
    retrievals INTEGER NOT NULL DEFAULT 0,
    bytes INTEGER NOT NULL DEFAULT 0,
    records INTEGER NOT NULL DEFAULT 0,
    occurrences INTEGER NOT NULL DEFAULT 0,
    lastRetrieval INTEGER,
    tornFrames INTEGER NOT NULL DEFAULT 0,
    gaps INTEGER NOT NULL DEFAULT 0);
INSERT INTO counter(id, storeId) VALUES (1, lower(hex(randomblob(16))));

CREATE TABLE initiator(id INTEGER PRIMARY KEY, key TEXT NOT NULL UNIQUE, wwpn BLOB, wwnn BLOB, host TEXT);
CREATE TABLE port(id INTEGER PRIMARY KEY, wwpn BLOB NOT NULL UNIQUE, wwnn BLOB, fcId INTEGER);

CREATE TABLE generation(id INTEGER PRIMARY KEY, name TEXT NOT NULL UNIQUE, ended INTEGER NOT NULL DEFAULT 0);
CREATE TABLE frame(
    number INTEGER PRIMARY KEY, generation INTEGER NOT NULL, time INTEGER NOT NULL, bytes INTEGER NOT NULL,
    records INTEGER NOT NULL, occurrences INTEGER NOT NULL, torn INTEGER NOT NULL);

CREATE TABLE episode(
    id INTEGER PRIMARY KEY, initiator INTEGER NOT NULL, kind INTEGER NOT NULL, port INTEGER NOT NULL,
    phase INTEGER NOT NULL, openSeq INTEGER NOT NULL, updateSeq INTEGER NOT NULL, closeSeq INTEGER NOT NULL,
    changeTime INTEGER NOT NULL, count INTEGER NOT NULL, records INTEGER NOT NULL, first INTEGER NOT NULL,
    last INTEGER NOT NULL, flags INTEGER NOT NULL, identity INTEGER NOT NULL, detail BLOB NOT NULL);
CREATE INDEX episode_last ON episode(last);
CREATE INDEX episode_open ON episode(phase) WHERE phase < 2;
CREATE TABLE change(seq INTEGER PRIMARY KEY, episode INTEGER NOT NULL);
CREATE TABLE record(
    episode INTEGER NOT NULL, ordinal INTEGER NOT NULL, count INTEGER NOT NULL, data BLOB NOT NULL,
    PRIMARY KEY (episode, ordinal)) WITHOUT ROWID;

CREATE TABLE minute(
    slot INTEGER NOT NULL, initiator INTEGER NOT NULL, kind INTEGER NOT NULL, port INTEGER NOT NULL,
    count INTEGER NOT NULL, spread INTEGER NOT NULL, last INTEGER NOT NULL,
    PRIMARY KEY (slot, initiator, kind, port)) WITHOUT ROWID;
CREATE TABLE day(
    slot INTEGER NOT NULL, initiator INTEGER NOT NULL, kind INTEGER NOT NULL, port INTEGER NOT NULL,
    count INTEGER NOT NULL, spread INTEGER NOT NULL, last INTEGER NOT NULL,
    PRIMARY KEY (slot, initiator, kind, port)) WITHOUT ROWID;
CREATE TABLE total(
    initiator INTEGER NOT NULL, kind INTEGER NOT NULL, port INTEGER NOT NULL,
    taken INTEGER NOT NULL, retired INTEGER NOT NULL, last INTEGER NOT NULL,
    PRIMARY KEY (initiator, kind, port)) WITHOUT ROWID;

CREATE TABLE ledger(
    generation INTEGER NOT NULL, initiator INTEGER NOT NULL, kind INTEGER NOT NULL,
    received INTEGER NOT NULL DEFAULT 0, collectionOff INTEGER NOT NULL DEFAULT 0,
    totalLimit INTEGER NOT NULL DEFAULT 0, unknownBoard INTEGER NOT NULL DEFAULT 0, noList INTEGER NOT NULL DEFAULT 0,
    tooShort INTEGER NOT NULL DEFAULT 0, unknownKind INTEGER NOT NULL DEFAULT 0, failed INTEGER NOT NULL DEFAULT 0,
    consolidated INTEGER NOT NULL DEFAULT 0, handedOver INTEGER NOT NULL DEFAULT 0, held INTEGER NOT NULL DEFAULT 0,
    dropped INTEGER NOT NULL DEFAULT 0, taken INTEGER NOT NULL DEFAULT 0, lost INTEGER NOT NULL DEFAULT 0,
    PRIMARY KEY (generation, initiator, kind)) WITHOUT ROWID;
CREATE TABLE gap(
    seq INTEGER PRIMARY KEY, timeFrom INTEGER NOT NULL, timeTo INTEGER NOT NULL, reason TEXT NOT NULL,
    generation TEXT NOT NULL, isCountKnown INTEGER NOT NULL);
CREATE UNIQUE INDEX gap_once ON gap(generation, reason) WHERE generation <> '';
CREATE INDEX gap_to ON gap(timeTo);
CREATE TABLE gapCount(
    gap INTEGER NOT NULL, initiator INTEGER NOT NULL, kind INTEGER NOT NULL, held INTEGER NOT NULL,
    handedOver INTEGER NOT NULL, PRIMARY KEY (gap, initiator, kind)) WITHOUT ROWID;

CREATE TABLE run(id INTEGER PRIMARY KEY, timeFrom INTEGER NOT NULL, timeTo INTEGER NOT NULL, ended INTEGER NOT NULL);
CREATE INDEX run_to ON run(timeTo);
CREATE TABLE coverage(
    id INTEGER PRIMARY KEY, initiator INTEGER NOT NULL, kind INTEGER NOT NULL, state INTEGER NOT NULL,
    timeFrom INTEGER NOT NULL, timeTo INTEGER);
CREATE INDEX coverage_to ON coverage(timeTo);

CREATE TABLE mark(name TEXT PRIMARY KEY, time INTEGER NOT NULL) WITHOUT ROWID;
CREATE TABLE value(name TEXT PRIMARY KEY, value TEXT NOT NULL) WITHOUT ROWID;
)sql";

/// `thing` is a ZTETopologyThing; `body` is described in ThingBody.h. An interval without an end is open. `scan` has a
/// row for each stretch of scans that lie close together and had the same files blocked, one a line. `portCounter` has
/// slots as `minute`.
static constexpr const char* scTopologyVersion = R"sql(
CREATE TABLE topology(
    id INTEGER PRIMARY KEY, thing INTEGER NOT NULL, key TEXT NOT NULL, body BLOB NOT NULL, timeFrom INTEGER NOT NULL,
    timeTo INTEGER);
CREATE INDEX topology_to ON topology(timeTo, timeFrom);
CREATE INDEX topology_from ON topology(timeFrom);
CREATE TABLE scan(id INTEGER PRIMARY KEY, timeFrom INTEGER NOT NULL, timeTo INTEGER NOT NULL, blocked TEXT NOT NULL);
CREATE INDEX scan_from ON scan(timeFrom);
CREATE INDEX scan_to ON scan(timeTo);
CREATE TABLE counterName(id INTEGER PRIMARY KEY, name TEXT NOT NULL UNIQUE);
CREATE TABLE portCounter(
    slot INTEGER NOT NULL, initiator INTEGER NOT NULL, port INTEGER NOT NULL, counter INTEGER NOT NULL,
    difference INTEGER NOT NULL, PRIMARY KEY (slot, initiator, port, counter)) WITHOUT ROWID;
)sql";

ZTCSchemaSteps getSchemaSteps() {
    static constexpr std::array scSteps = {scFirstVersion, scTopologyVersion};
    return scSteps;
}

static std::size_t sReadVersion(ZTCDatabase& arDatabase, ZTCSchemaSteps aSteps) {
    const std::int64_t lVersion = arDatabase.readNumber("PRAGMA user_version");
    if (lVersion < 0 || lVersion > static_cast<std::int64_t>(aSteps.size())) {
        throw ZTCStoreNewerEx(arDatabase.getPath() + ": its schema has version " + std::to_string(lVersion) +
                              ", this program knows versions up to " + std::to_string(aSteps.size()) +
                              ": it was written by a newer version of Tavik and is left as it is");
    }
    return static_cast<std::size_t>(lVersion);
}

void migrateSchema(ZTCDatabase& arDatabase, ZTCSchemaSteps aSteps) {
    if (sReadVersion(arDatabase, aSteps) == aSteps.size()) {
        return;
    }
    arDatabase.execute("BEGIN IMMEDIATE");
    try {
        for (std::size_t i = sReadVersion(arDatabase, aSteps); i < aSteps.size(); ++i) {
            arDatabase.execute(aSteps[i]);
        }
        arDatabase.execute(("PRAGMA user_version = " + std::to_string(aSteps.size())).c_str());
        arDatabase.execute("COMMIT");
    } catch (...) {
        arDatabase.rollBack();
        throw;
    }
}

void refuseNewerSchema(ZTCDatabase& arDatabase, ZTCSchemaSteps aSteps) {
    sReadVersion(arDatabase, aSteps);
}

void checkSchema(ZTCDatabase& arDatabase, ZTCSchemaSteps aSteps) {
    const std::size_t lVersion = sReadVersion(arDatabase, aSteps);
    if (lVersion == 0) {
        throw ZTCNoHistoryEx(arDatabase.getPath() + ": there is no history yet: the sensor is about to make it");
    }
    if (lVersion < aSteps.size()) {
        throw ZTCNoHistoryEx(arDatabase.getPath() + ": its schema has version " + std::to_string(lVersion) +
                             ", this program reads version " + std::to_string(aSteps.size()) +
                             ": the sensor makes it at its next start");
    }
}
