#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace kelo::platform {

// Receives the rows of an answer. The texts are NUL-terminated, and valid during the call only.
class RowTaker {
public:
    virtual ~RowTaker() = default;
    virtual void TakeColumns(const std::vector<std::string> &names) = 0;
    virtual void TakeRow(std::span<const std::string> values) = 0;
};

// The text that ends each row of an answer as a column of its own: so a row is known to be whole, and an
// error text in the place of rows is none.
inline constexpr std::string_view kRowEnd = "kelo.";

// Reads rows of tab-separated values, however they are cut into parts.
class AnswerReader {
public:
    // `columns` without the one that ends a row.
    AnswerReader(size_t columns, RowTaker &rows) : values_(columns + 1), rows_(rows) {}

    // Throws ClusterError for anything but such rows.
    void Take(std::string_view part);
    // Throws ClusterError unless the last row was whole.
    void Finish() const;

private:
    void TakeLine(std::string_view line);

    std::vector<std::string> values_;
    RowTaker &rows_;
    std::string begun_; // a line whose end has not come
};

} // namespace kelo::platform
