/// What tests look at in a history when nothing is in flight.
#ifndef TESTS_SENSOR_HISTORYCHECK_H
#define TESTS_SENSOR_HISTORYCHECK_H

#include <cstdint>
#include <string>
#include <vector>

/// "ok", or what SQLite finds wrong with the database in this directory.
std::string checkIntegrity(const std::string& acrStateDirectory);

/// As another version of the sensor leaves it.
void setSchemaVersion(const std::string& acrStateDirectory, unsigned aVersion);
unsigned getSchemaVersion(const std::string& acrStateDirectory);

/// The names of the files in the spool.
std::vector<std::string> listSpool(const std::string& acrStateDirectory);

/// Occurrences that the history has, those that retention took away included; 0 where there is no history yet.
std::uint64_t countStored(const std::string& acrStateDirectory);

/// Occurrences that agents refused, by the ledger.
std::uint64_t countRefused(const std::string& acrStateDirectory);

/// Fails the test unless the database is whole, the ledger's equations hold in each row, the episodes have what the
/// ledger says, and the spool is empty.
void expectSoundHistory(const std::string& acrStateDirectory);

/// The same while a collector runs that has nothing more to take in: its ledger follows with its next look.
void waitForSoundHistory(const std::string& acrStateDirectory);

#endif
