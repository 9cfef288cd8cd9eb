#include "receive/device_names.h"

#include "base/text_encoding.h"

namespace kelo::tool {
namespace {

constexpr size_t kMaxBytes = 255; // of a host name in the domain name system

std::string_view Cut(std::string_view name) {
    const size_t whole = WholeCharacters(name, kMaxBytes);
    return name.substr(0, whole > 0 ? whole : kMaxBytes); // 0: nothing in it is UTF-8
}

} // namespace

const std::string &DeviceNames::NameFor(const std::string &host) {
    const std::string_view name = Cut(host.c_str());
    if (const auto known = names_.find(name); known != names_.end())
        return *known;
    if (names_.size() < limit_)
        return *names_.emplace(name).first;
    ++others_;
    return othersName_;
}

} // namespace kelo::tool
