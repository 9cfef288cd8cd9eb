#pragma once

// Commands written as JSON objects, one after the other.
//
// Threads: a parser holds no state and may be used from any thread, by several at a time.

#include <json/value.h>

#include <string>
#include <vector>

#include "kelosyslog/export.h"

// Splits a command text after every closing brace and reads each piece as one JSON value:
//
//     std::string text = R"({"cmd":"start"}{"cmd":"stop","ids":[1,2]})";
//     std::vector<Json::Value> commands;
//     CmdParser().CmdParse(text, commands); // appends two values
//
// So a command is a flat object: an object within an object, or a "}" in a string, splits it in the wrong
// place and fails. White space is allowed before an object but not after the last one.
class KELOSYSLOG_API CmdParser {
public:
    CmdParser();
    ~CmdParser();

    // Appends the values of `text`, which is only read, to `commands`, which is not cleared.
    //
    // Returns true when every piece parsed; an empty text has none. At the first piece that is not a JSON
    // value, is nested deeper than the JSON reader allows (1000 levels) or finds no memory, it writes one
    // message to the system log and returns false: the values before it stay appended, and the rest is not
    // read. Never throws.
    bool CmdParse(std::string &text, std::vector<Json::Value> &commands);
};
