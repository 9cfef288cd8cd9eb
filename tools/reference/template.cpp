#include "reference/template.h"

#include <set>
#include <sstream>
#include <stdexcept>

namespace kelo::tool {

std::string FillTemplate(const std::string &text, const std::map<std::string, std::string> &parts) {
    std::string filled;
    std::set<std::string> used;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        if (!line.starts_with('@')) {
            filled += line + "\n";
            continue;
        }
        const auto part = parts.find(line.substr(1));
        if (part == parts.end())
            throw std::runtime_error("line '" + line + "': there is no such part");
        filled += part->second;
        used.insert(part->first);
    }
    for (const auto &[name, part] : parts) {
        if (!part.empty() && !used.contains(name))
            throw std::runtime_error("a line '@" + name + "' is missing");
    }
    return filled;
}

} // namespace kelo::tool
