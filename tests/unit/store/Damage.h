/// Damages a history, as a bad disk does.
#ifndef TESTS_UNIT_STORE_DAMAGE_H
#define TESTS_UNIT_STORE_DAMAGE_H

#include <string>

/// Spoils all pages of the database but the first two: the schema can be read, the tables cannot. A program that has
/// the database open notices it, because it reads the pages anew.
void damageHistory(const std::string& acrPath);

#endif
