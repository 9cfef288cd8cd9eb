#include "keloplatform/gensqlregexp.h"

namespace {

std::string Quoted(const std::string &text) {
    std::string quoted = "'";
    for (const char byte : text) {
        quoted += byte;
        if (byte == '\'')
            quoted += byte;
    }
    return quoted + "'";
}

} // namespace

std::string GenSQLRegexp(std::string pattern, std::string column) {
    if (pattern == "*")
        return column + " GLOB '**'";
    return "instr(" + column + ", " + Quoted(pattern) + ") > 0";
}
