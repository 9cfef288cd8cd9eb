#include "confirm.h"

#include <unistd.h>

#include <iostream>

#include "errors.h"
#include "text_encoding.h"

namespace kelo::tool {

bool ConfirmDeletion(const std::string &command, const std::string &what) {
    if (isatty(STDIN_FILENO) == 0)
        throw UsageError(command + ": no terminal to ask on; add --yes to delete " + what);
    std::cerr << "Delete " << VisibleText(what) << "? [y/N] " << std::flush;
    std::string answer;
    std::getline(std::cin, answer);
    return answer == "y" || answer == "Y" || answer == "yes";
}

} // namespace kelo::tool
