/// The tables of the history, and how a database of an older version gets them.
#ifndef SENSOR_STORE_SRC_SCHEMA_H
#define SENSOR_STORE_SRC_SCHEMA_H

#include <span>

#include "sensor/store/src/Database.h"

/// The statements that lead from version n to version n + 1, for n = 0, 1, 2 ... The version is SQLite's user_version.
using ZTCSchemaSteps = std::span<const char* const>;

/// Those of this program. Docs: docs/history.md.
ZTCSchemaSteps getSchemaSteps();

/// Makes every step that the database has not had yet, in one transaction. Throws ZTCStoreNewerEx where the database
/// has had more steps than there are.
void migrateSchema(ZTCDatabase& arDatabase, ZTCSchemaSteps aSteps);

/// Throws ZTCStoreNewerEx where the database has had more steps than there are. Changes nothing.
void refuseNewerSchema(ZTCDatabase& arDatabase, ZTCSchemaSteps aSteps);

/// For readers: throws ZTCStoreNewerEx, or ZTCNoHistoryEx where steps are missing.
void checkSchema(ZTCDatabase& arDatabase, ZTCSchemaSteps aSteps);

#endif
