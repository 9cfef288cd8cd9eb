#pragma once

#include <string>
#include <vector>

#include "support/temp_root.h"

struct DBConnect_tag;

namespace kelo::test {

// A table "logs" of texts (column "msg") and one row whose text is NULL, searched through the platform's own
// connections.
class SearchTable {
public:
    explicit SearchTable(const std::vector<std::string> &texts);
    ~SearchTable();
    SearchTable(const SearchTable &) = delete;
    SearchTable &operator=(const SearchTable &) = delete;

    // The texts that the keyword finds, in their order. A statement that fails gives its error text.
    std::vector<std::string> Matching(const std::string &keyword) const;
    bool MatchesNull(const std::string &keyword) const;
    // -1 when the statement fails.
    int CountWhere(const std::string &condition) const;
    int Run(const std::string &sql) const;
    std::string Error() const;

private:
    TempRoot root_;
    std::vector<std::string> texts_;
    DBConnect_tag *connection_ = nullptr;
};

} // namespace kelo::test
