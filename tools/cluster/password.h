#pragma once

#include <string>

namespace kelo::tool {

// A password that nobody guesses. Throws OutputError when the system has no random numbers.
std::string MakePassword();

// The SHA-256 of a text in hexadecimal digits.
std::string Sha256Hex(const std::string &text);

} // namespace kelo::tool
