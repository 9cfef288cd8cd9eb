#include "cli/confirm.h"

#include <unistd.h>

#include <cctype>
#include <iostream>

#include "base/errors.h"
#include "base/text_encoding.h"

namespace kelo::tool {

bool Confirm(const std::string &command, const std::string &action) {
    if (isatty(STDIN_FILENO) == 0)
        throw UsageError(command + ": no terminal to ask on; add --yes to " + action);
    std::string question = EscapeForTerminal(action);
    question.front() = static_cast<char>(std::toupper(static_cast<unsigned char>(question.front())));
    std::cerr << question << "? [y/N] " << std::flush;
    std::string answer;
    std::getline(std::cin, answer);
    return answer == "y" || answer == "Y" || answer == "yes";
}

} // namespace kelo::tool
