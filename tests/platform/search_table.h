#pragma once

#include "platform/db_fixture.h"

namespace kelo::test {

// A table "logs" of texts (column "msg") and one row whose text is NULL, searched through a connection of the
// platform's.
class SearchTable {
public:
    explicit SearchTable(const std::vector<std::string> &texts);

    // The texts that the keyword finds, in their order. A statement that fails gives its error text.
    std::vector<std::string> Matching(const std::string &keyword) const;
    // How many rows a condition is true for; -1 when the statement fails.
    int CountWhere(const std::string &condition) const;

    const Connection &Database() const { return connection_; }

private:
    TempRoot root_;
    std::vector<std::string> texts_;
    Connection connection_;
};

} // namespace kelo::test
