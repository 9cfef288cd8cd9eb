#pragma once

#include <random>
#include <string>

#include "ledger.h"
#include "site.h"

namespace kelo::stress {

enum class Damage { kPages, kHeader, kWal };

// Overwrites parts of the files of a database, and notes the tokens that they held. No process may run
// meanwhile. Returns false if there is nothing to overwrite.
bool Inflict(Damage damage, const std::string &path, std::mt19937_64 &random, Ledger &ledger);

} // namespace kelo::stress
