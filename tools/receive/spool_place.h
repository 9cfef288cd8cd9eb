#pragma once

#include <span>
#include <string>
#include <vector>

#include "base/sqlite.h"
#include "receive/spool_file.h"

namespace kelo::tool {

// The places of the readers of the message spool, in table spool_place of the database that has what they
// made of it: so both change in one transaction.

// Statements that replace the places of the reader.
std::vector<std::string> PlaceStatements(SpoolReader reader, std::span<const SpoolPlace> places);

// None from a database that has never had any. Throws SqliteError.
std::vector<SpoolPlace> LoadPlaces(SqliteConnection &database, SpoolReader reader);

} // namespace kelo::tool
