// Commands as JSON objects, one behind the other, as they come through a pipe or a socket.

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

    // What was understood before the mistake is appended to what was there.
    text = R"({"cmd":"status"}{"cmd":)";
    std::cout << parser.CmdParse(text, commands) << ": " << commands.size() << " commands\n";

    // The text is cut behind every closing brace: a command is a flat object.
    text = R"({"cmd":{"nested":1}})";
    std::cout << parser.CmdParse(text, commands) << ": " << commands.size() << " commands\n";
}
