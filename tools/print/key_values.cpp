#include "print/key_values.h"

#include <algorithm>

#include "base/text_encoding.h"
#include "print/output.h"

namespace kelo::tool {

void KeyValues::Add(const std::string &name, const std::string &text) {
    Entry entry{name, {EscapeForTerminal(text)}, ""};
    AppendJsonString(entry.json, text);
    entries_.push_back(std::move(entry));
}

void KeyValues::Add(const std::string &name, int64_t number) {
    entries_.push_back({name, {std::to_string(number)}, std::to_string(number)});
}

void KeyValues::AddBool(const std::string &name, bool yes) {
    entries_.push_back({name, {yes ? "yes" : "no"}, yes ? "true" : "false"});
}

void KeyValues::AddUnknown(const std::string &name) {
    entries_.push_back({name, {}, "null"});
}

void KeyValues::AddList(const std::string &name, const std::vector<std::string> &texts) {
    Entry entry{name, {}, "["};
    for (const std::string &text : texts) {
        entry.lines.push_back(EscapeForTerminal(text));
        entry.json += entry.json.size() > 1 ? ", " : "";
        AppendJsonString(entry.json, text);
    }
    entry.json += "]";
    entries_.push_back(std::move(entry));
}

std::string KeyValues::Render(OutputFormat format) const {
    size_t width = 0;
    for (const Entry &entry : entries_)
        width = std::max(width, entry.lines.empty() ? 0 : entry.name.size());
    std::string text;
    for (const Entry &entry : entries_) {
        if (format == OutputFormat::Json) {
            text += text.empty() ? "{\n  " : ",\n  ";
            AppendJsonString(text, entry.name);
            text += ": " + entry.json;
        } else {
            for (const std::string &line : entry.lines)
                text += entry.name + std::string(width + 2 - entry.name.size(), ' ') + line + "\n";
        }
    }
    return format == OutputFormat::Json ? text + "\n}\n" : text;
}

void Print(const KeyValues &values, OutputFormat format) {
    Output output(false);
    output.Write(values.Render(format));
    output.Finish();
}

} // namespace kelo::tool
