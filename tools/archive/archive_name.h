#pragma once

#include <string>

namespace kelo::tool {

// Archives are named "DEVICE_FIRST_LAST.db", where FIRST and LAST are the local dates of the oldest and the
// newest record; "DEVICE_FIRST_LAST.2.db" and so on if that is taken.

// A device name as a part of a file name: letters, digits, '.', '-' and '_' stay, any other byte and a
// leading
// '.' or '-' becomes '_'; cut to 100 bytes. "_" for the empty name.
std::string SafeDeviceName(const std::string &device);

// Name of an archive. Dates are as "2020-01-02"; `number` is 1 for the name without a number.
std::string ArchiveName(const std::string &device, const std::string &firstDate, const std::string &lastDate,
                        int number);

// Whether a file of this name can be an archive.
bool IsArchiveName(const std::string &name);

} // namespace kelo::tool
