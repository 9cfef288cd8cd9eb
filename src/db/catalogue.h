#pragma once

#include <string>

namespace kelo {

// The statement that counts the tables of this name, which is not escaped.
inline std::string CatalogueQuery(const std::string &table) {
    return "SELECT count(*) as count_result FROM sqlite_master WHERE type='table' AND name='" + table + "'";
}

} // namespace kelo
