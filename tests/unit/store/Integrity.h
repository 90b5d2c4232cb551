/// What has to hold of every database after every kill: SQLite's own check, and sums that belong together.
#ifndef TESTS_UNIT_STORE_INTEGRITY_H
#define TESTS_UNIT_STORE_INTEGRITY_H

#include <gtest/gtest.h>

#include <cstdint>
#include <string>

/// The first column of the first row, as text; read with a connection of its own.
std::string queryText(const std::string& acrPath, const std::string& acrSql);
std::int64_t queryNumber(const std::string& acrPath, const std::string& acrSql);

/// Expects that the database is sound, and that episodes, counts, totals, ledger and frames agree on the
/// occurrences.
void expectIntegrity(const std::string& acrPath);

#endif
