#pragma once

#include <string>

namespace kelo {

// Whether the file is there and holds no byte: what is left of a creation that failed or was broken off. Such
// a database counts as missing.
bool IsEmptyFile(const std::string &path);

enum class Creation {
    kAlways,
    kIfMissing, // and not when somebody else has created it in the meantime
};

// Creates a database with the sqlite3 tool, as DBHandler::DBCreate says, under the lock of its path; what a
// creation leaves that failed is removed. Returns 0, or -1 after a report.
int CreateDatabase(const std::string &dbPath, const std::string &schemaPath, Creation when);

// Waits until nobody creates, moves or removes the database any more, and finishes a creation that was broken
// off. Returns false, after a report, if that takes too long.
bool AwaitCreation(const std::string &dbPath, const std::string &schemaPath);

// Gives a new database to the owner of its folder: a service must be able to write what root creates there.
// Only root can give files away; for others it does nothing.
void GiveToOwnerOfFolder(const std::string &dbPath);

} // namespace kelo
