#include "print/key_values.h"

#include <algorithm>

#include "base/json.h"
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
    std::string text;
    if (format == OutputFormat::Json) {
        JsonObject object(text, JsonObject::Layout::kLineEach);
        for (const Entry &entry : entries_)
            object.AddJson(entry.name, entry.json);
        object.End();
        return text;
    }
    size_t width = 0;
    for (const Entry &entry : entries_)
        width = std::max(width, entry.lines.empty() ? 0 : entry.name.size());
    for (const Entry &entry : entries_) {
        for (const std::string &line : entry.lines)
            text += entry.name + std::string(width + 2 - entry.name.size(), ' ') + line + "\n";
    }
    return text;
}

void Print(const KeyValues &values, OutputFormat format) {
    Output output(false);
    output.Write(values.Render(format));
    output.Finish();
}

} // namespace kelo::tool
