#pragma once

#include <string>
#include <vector>

#include "print/record_formatter.h"

namespace kelo::tool {

// What a command has done, or would do: lines that are printed at once or, in JSON, an object with the array
// "actions" at the end.
class ActionLines {
public:
    // `format`: Text or Json.
    explicit ActionLines(OutputFormat format) : format_(format) {}

    void Add(const std::string &line);
    // Call it last.
    void End() const;

private:
    OutputFormat format_;
    std::vector<std::string> lines_; // for JSON
};

} // namespace kelo::tool
