#include "print/action_lines.h"

#include "base/text_encoding.h"
#include "print/key_values.h"
#include "print/output.h"

namespace kelo::tool {

void ActionLines::Add(const std::string &line) {
    if (format_ == OutputFormat::Json) {
        lines_.push_back(line);
        return;
    }
    Output output(false);
    output.Write(EscapeForTerminal(line) + "\n");
    output.Finish();
}

void ActionLines::End() const {
    if (format_ != OutputFormat::Json)
        return;
    KeyValues values;
    values.AddList("actions", lines_);
    Print(values, format_);
}

} // namespace kelo::tool
