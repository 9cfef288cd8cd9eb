#include "commands/key_values.h"

#include <algorithm>

#include "base/errors.h"
#include "base/text_encoding.h"

namespace kelo::tool {

void KeyValues::Add(const std::string &name, const std::string &text) {
    Fact fact{name, {EscapeForTerminal(text)}, ""};
    AppendJsonString(fact.json, text);
    facts_.push_back(std::move(fact));
}

void KeyValues::Add(const std::string &name, int64_t number) {
    facts_.push_back({name, {std::to_string(number)}, std::to_string(number)});
}

void KeyValues::AddBool(const std::string &name, bool yes) {
    facts_.push_back({name, {yes ? "yes" : "no"}, yes ? "true" : "false"});
}

void KeyValues::AddUnknown(const std::string &name) {
    facts_.push_back({name, {}, "null"});
}

void KeyValues::AddList(const std::string &name, const std::vector<std::string> &texts) {
    Fact fact{name, {}, "["};
    for (const std::string &text : texts) {
        fact.lines.push_back(EscapeForTerminal(text));
        fact.json += fact.json.size() > 1 ? ", " : "";
        AppendJsonString(fact.json, text);
    }
    fact.json += "]";
    facts_.push_back(std::move(fact));
}

std::string KeyValues::Render(OutputFormat format) const {
    size_t width = 0;
    for (const Fact &fact : facts_)
        width = std::max(width, fact.lines.empty() ? 0 : fact.name.size());
    std::string text;
    for (const Fact &fact : facts_) {
        if (format == OutputFormat::Json) {
            text += text.empty() ? "{\n  " : ",\n  ";
            AppendJsonString(text, fact.name);
            text += ": " + fact.json;
        } else {
            for (const std::string &line : fact.lines)
                text += fact.name + std::string(width + 2 - fact.name.size(), ' ') + line + "\n";
        }
    }
    return format == OutputFormat::Json ? text + "\n}\n" : text;
}

void AddKeyValuesFormat(CLI::App &command, std::string &format) {
    AddText(command, "-o,--output", format, "FORMAT", "text (default) or json (one object)");
}

OutputFormat ParseKeyValuesFormat(const std::string &format) {
    const OutputFormat parsed = ParseOutputFormat(format);
    if (parsed != OutputFormat::Text && parsed != OutputFormat::Json)
        throw UsageError("--output: there is no form '" + format + "' of this; forms are text, json");
    return parsed;
}

void Print(const KeyValues &facts, OutputFormat format) {
    Output output(false);
    output.Write(facts.Render(format));
    output.Finish();
}

} // namespace kelo::tool
