#pragma once

#include <string>

namespace kelo::tool {

// The lines that the program writes to the standard error, after its name: notes, and the error that it ends
// with. In JSON each line is an object: "code" is "note", "usage", "database", "system", or says more about a
// database: "busy", "missing", "permission", "damaged", "full", "table" or "column". An error has the exit
// "status", and "option", if one is to blame. "text" is the line of the text form.
enum class MessageForm { kText, kJson };

// The form of all lines from now on; text before.
void SetMessageForm(MessageForm form);
// The form of this name ("text", "json"). Throws UsageError naming --errors.
MessageForm ParseMessageForm(const std::string &name);

// One line, with control bytes made visible.
void PrintMessage(const std::string &text);
void PrintError(int status, const std::string &text);

} // namespace kelo::tool
