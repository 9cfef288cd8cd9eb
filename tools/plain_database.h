#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "log_source.h"

struct DBConnect_tag;

namespace kelo::tool {

// A connection that only tells what is wrong: unlike a DBHandler it creates no file and puts none aside.
class PlainDatabase {
public:
    // Throws DatabaseError when the file cannot be opened.
    explicit PlainDatabase(LogSource source);

    // The values of these columns of the first row; none without a row. NULL is "". Throws DatabaseError with
    // SQLite's words.
    using Row = std::vector<std::string>;
    std::optional<Row> FirstRow(const std::string &sql, const std::vector<std::string> &columns) const;
    std::vector<std::string> Column(const std::string &sql, const std::string &column) const;
    // The first row's column "value" as a number; 0 without one.
    int64_t Number(const std::string &sql) const;
    bool HasTable(const std::string &table) const;

private:
    struct Closer {
        void operator()(DBConnect_tag *connection) const;
    };
    std::vector<Row> Query(const std::string &sql, const std::vector<std::string> &columns) const;

    LogSource source_;
    std::unique_ptr<DBConnect_tag, Closer> connection_;
};

} // namespace kelo::tool
