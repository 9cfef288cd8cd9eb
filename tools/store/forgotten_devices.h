#pragma once

// Devices that are removed from the accounting database.
//
// A running receiver has all counts in memory and writes them with each flush, so what is deleted comes back.
// The names are therefore kept in table "forgotten" of the database until the receiver has forgotten them
// too.

#include <cstdint>
#include <string>
#include <vector>

namespace kelo::tool {

// Removes the devices from the database at `path`, with their samples, and notes their names. Gives unused
// space back to the disk when that is worth it. Throws DatabaseError; then nothing has changed.
void ForgetDevices(const std::string &path, const std::vector<std::string> &names);

// Removes once more the devices that were noted, and the notes. Returns whether there were any. Throws
// DatabaseError. For the owner of the counts, between a flush and loading them anew.
bool DropForgottenDevices(const std::string &path);

} // namespace kelo::tool
