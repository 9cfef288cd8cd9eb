#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "commands/common_options.h"

namespace kelo::tool {

// What a command found out or did: named values, in order, as lines of a name and a value or as one JSON
// object.
class KeyValues {
public:
    // `number` and `yes` as JSON has them; an unknown value is null there and left out of the lines.
    void Add(const std::string &name, const std::string &text);
    void Add(const std::string &name, int64_t number);
    void AddBool(const std::string &name, bool yes);
    void AddUnknown(const std::string &name);
    // An array; in the lines one line each.
    void AddList(const std::string &name, const std::vector<std::string> &texts);

    // `format` is Text or Json.
    std::string Render(OutputFormat format) const;

private:
    struct Fact {
        std::string name;
        std::vector<std::string> lines;
        std::string json;
    };
    std::vector<Fact> facts_;
};

// The option --output for facts.
void AddKeyValuesFormat(CLI::App &command, std::string &format);
// The format of that name. Throws UsageError for any but text and json.
OutputFormat ParseKeyValuesFormat(const std::string &format);
// Writes to the standard output.
void Print(const KeyValues &facts, OutputFormat format);

} // namespace kelo::tool
