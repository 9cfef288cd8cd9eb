// Commands as JSON objects, one after the other, as they arrive through a pipe or a socket.

#include <json/value.h>
#include <kelosyslog/cmdparser.h>
#include <syslog.h>

#include <iostream>

int main() {
    openlog("example", LOG_PERROR, LOG_USER);
    CmdParser parser;
    std::vector<Json::Value> commands;

    std::string text = R"({"cmd":"start"} {"cmd":"stop","ids":[1,2]})";
    std::cout << parser.CmdParse(text, commands) << ": " << commands.size() << " commands\n";
    std::cout << "  " << commands[0]["cmd"].asString() << "\n";
    std::cout << "  " << commands[1]["cmd"].asString() << " " << commands[1]["ids"].size() << " ids\n";

    // The values before the error are appended to the existing ones.
    text = R"({"cmd":"status"}{"cmd":)";
    std::cout << parser.CmdParse(text, commands) << ": " << commands.size() << " commands\n";

    // The text is split after every closing brace: a command is a flat object.
    text = R"({"cmd":{"nested":1}})";
    std::cout << parser.CmdParse(text, commands) << ": " << commands.size() << " commands\n";
}
