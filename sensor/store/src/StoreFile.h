/// The database as a file: its place, its mode, and what becomes of a damaged one.
#ifndef SENSOR_STORE_SRC_STOREFILE_H
#define SENSOR_STORE_SRC_STOREFILE_H

#include <cstdint>
#include <string>

/// A database that was set aside has a name of these two with the date in between.
inline constexpr const char* gcDamagedPrefix = "history.damaged-";
inline constexpr const char* gcHistorySuffix = ".db";

/// "DIRECTORY/history.db".
std::string getHistoryPath(const std::string& acrStateDirectory);

/// Makes an empty file of mode 0640 where there is none. The journal's files get the mode of the database. Throws
/// ZTCStoreNoRoomEx.
void createHistoryFile(const std::string& acrPath);

/// Renames the database to "history.damaged-YYYYMMDD-HHMMSS.db" (UTC; "-2" and so on where that is taken) and its
/// journal alike, and syncs the directory. Returns the new path. Throws ZTCStoreNoRoomEx.
std::string setDamagedFileAside(const std::string& acrPath);

/// Bytes of a file; 0 where there is none.
std::uint64_t getFileBytes(const std::string& acrPath);

#endif
