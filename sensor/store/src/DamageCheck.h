/// Looks for damage in a database that has just been opened, so that it is set aside before anything is taken in.
#ifndef SENSOR_STORE_SRC_DAMAGECHECK_H
#define SENSOR_STORE_SRC_DAMAGECHECK_H

#include <cstdint>
#include <string>

#include "sensor/store/src/Database.h"

/// A database of at most this size is checked whole, which takes about a tenth of a second. Of a larger one the first
/// row of each table is read: collecting must not wait. What that does not find shows when the page is read.
inline constexpr std::uint64_t gcWholeCheckBytes = 32ULL * 1024 * 1024;

/// Throws ZTCStoreDamagedEx where the file has bytes and does not begin as a database does. To be called before it is
/// opened: a journal beside it might hide that.
void refuseForeignFile(const std::string& acrPath);

/// Throws ZTCStoreDamagedEx.
void checkForDamage(ZTCDatabase& arDatabase, std::uint64_t aWholeCheckBytes = gcWholeCheckBytes);

#endif
