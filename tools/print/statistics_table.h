#pragma once

#include <string>
#include <vector>

#include "print/record_formatter.h"

namespace kelo::tool {

struct StatisticsColumn {
    const char *name;
    bool isNumber;
};

// Figures in columns, as the text, json, jsonl and csv of the program.
class StatisticsTable {
public:
    explicit StatisticsTable(std::vector<StatisticsColumn> columns) : columns_(std::move(columns)) {}

    // A row with a cell for each column. A number is given in the form of JSON.
    void Add(std::vector<std::string> cells) { rows_.push_back(std::move(cells)); }
    bool IsEmpty() const { return rows_.empty(); }

    // The table in one of the formats but Short. Without rows there is no heading in text.
    std::string Write(OutputFormat format, bool hasHeader) const;

    // The table as text with a bar after each row: as long as the number in column `bar`, and the longest as
    // long as what `width` characters leave free. Blocks of an eighth are drawn, or '#' without `inUnicode`.
    std::string Plot(size_t bar, size_t width, bool hasHeader, bool inUnicode) const;

private:
    std::vector<std::string> TextLines(bool hasHeader) const;
    std::string Json(bool isArray) const;
    std::string Csv(bool hasHeader, CsvStyle style) const;

    std::vector<StatisticsColumn> columns_;
    std::vector<std::vector<std::string>> rows_;
};

// A bar for `value` where `largest` takes `width` characters; at least an eighth for what is not 0.
std::string Bar(double value, double largest, size_t width, bool inUnicode);

// The number of characters in a line of the standard output's terminal; without a terminal the environment
// variable COLUMNS, or 80.
size_t OutputWidth();

} // namespace kelo::tool
