#include "archive/archive_name.h"

#include <cctype>
#include <regex>

namespace kelo::tool {
namespace {

constexpr size_t kLongestDevice = 100;

bool MayStay(char byte) {
    return std::isalnum(static_cast<unsigned char>(byte)) != 0 || byte == '.' || byte == '-' || byte == '_';
}

} // namespace

std::string SafeDeviceName(const std::string &device) {
    std::string name = device.substr(0, kLongestDevice);
    for (char &byte : name)
        byte = MayStay(byte) ? byte : '_';
    if (name.empty())
        return "_";
    if (name.front() == '.' || name.front() == '-') // hidden, or read as an option
        name.front() = '_';
    return name;
}

std::string ArchiveName(const std::string &device, const std::string &firstDate, const std::string &lastDate,
                        int number) {
    return SafeDeviceName(device) + "_" + firstDate + "_" + lastDate +
           (number > 1 ? "." + std::to_string(number) : "") + ".db";
}

bool IsArchiveName(const std::string &name) {
    static const std::regex kName("[A-Za-z0-9_][A-Za-z0-9._-]{0,99}(_[0-9]{4}-[0-9]{2}-[0-9]{2}){2}"
                                  "(\\.[1-9][0-9]*)?\\.db");
    return std::regex_match(name, kName);
}

} // namespace kelo::tool
