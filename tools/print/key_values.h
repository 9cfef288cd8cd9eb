#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "print/record_formatter.h"

namespace kelo::tool {

// The result of a command: named values, in order, as lines of a name and a value or as one JSON object.
class KeyValues {
public:
    // `number` and `yes` as JSON has them; an unknown value is null there and left out of the lines.
    void Add(const std::string &name, const std::string &text);
    void Add(const std::string &name, int64_t number);
    void AddBool(const std::string &name, bool yes);
    void AddUnknown(const std::string &name);
    // An array; printed as one line for each element.
    void AddList(const std::string &name, const std::vector<std::string> &texts);

    // The formats of Render: Text and Json.
    std::string Render(OutputFormat format) const;

private:
    struct Entry {
        std::string name;
        std::vector<std::string> lines;
        std::string json;
    };
    std::vector<Entry> entries_;
};

// Writes to the standard output.
void Print(const KeyValues &values, OutputFormat format);

} // namespace kelo::tool
