#include "cluster/server_error.h"

#include <algorithm>
#include <cctype>
#include <cstdlib>
#include <vector>

namespace kelo::platform {
namespace {

// Numbers of the engine's errors.
constexpr int kAboutOthers[] = {209, 210, 279, 519}; // time-out, network, no connection, no data of replicas
constexpr int kAboutRights[] = {164, 192, 193, 194, 195, 291, 497, 516};
constexpr size_t kMaxText = 600;

int CodeOf(std::string_view text) {
    constexpr std::string_view kCode = "Code: ";
    const size_t at = text.find(kCode);
    return at == std::string_view::npos ? 0
                                        : std::atoi(std::string(text.substr(at + kCode.size(), 6)).c_str());
}

// The servers that the text names, like "(10.0.0.2:9000)".
std::string ServersIn(std::string_view text) {
    std::vector<std::string_view> servers;
    for (size_t at = text.find('('); at != std::string_view::npos; at = text.find('(', at + 1)) {
        const std::string_view inside = text.substr(at + 1, text.find(')', at) - at - 1);
        const size_t colon = inside.rfind(':');
        const bool isServer = colon != std::string_view::npos && colon + 1 < inside.size() &&
                              std::all_of(inside.begin() + static_cast<ptrdiff_t>(colon) + 1, inside.end(),
                                          [](char byte) { return byte >= '0' && byte <= '9'; }) &&
                              inside.find(' ') == std::string_view::npos;
        if (isServer && std::find(servers.begin(), servers.end(), inside) == servers.end())
            servers.push_back(inside);
    }
    std::string names;
    for (const std::string_view server : servers)
        names.append(names.empty() ? "" : ", ").append(server);
    return names;
}

// The message without the names of classes around it, on one line.
std::string MessageOf(std::string_view text) {
    constexpr std::string_view kException = "Exception: ";
    const size_t start = text.find(kException);
    if (start != std::string_view::npos)
        text.remove_prefix(start + kException.size());
    text = text.substr(0, text.find(", e.what()"));
    std::string line;
    for (const char byte : text.substr(0, kMaxText)) {
        const bool isBlank = std::iscntrl(static_cast<unsigned char>(byte)) != 0 || byte == ' ';
        if (!isBlank)
            line += byte;
        else if (!line.empty() && line.back() != ' ')
            line += ' ';
    }
    while (line.ends_with(' '))
        line.pop_back();
    return line;
}

template <size_t count>
bool IsOneOf(const int (&codes)[count], int code) {
    return std::find(codes, codes + count, code) != codes + count;
}

} // namespace

ServerError ErrorOfServer(const std::string &url, long status, std::string_view text) {
    const int code = CodeOf(text);
    const std::string message = MessageOf(text);
    if (IsOneOf(kAboutOthers, code)) {
        const std::string servers = ServersIn(text);
        return {KELO_FAILURE_IO,
                "a part of the cluster is away: " + url + " cannot reach " +
                    (servers.empty() ? "another server (" + message + ")" : servers),
                true};
    }
    const std::string reason = message.empty() ? "HTTP status " + std::to_string(status) : message;
    const bool isAboutRights = IsOneOf(kAboutRights, code) || status == 401 || status == 403;
    return {isAboutRights ? KELO_FAILURE_PERMISSION : KELO_FAILURE_OTHER, url + ": " + reason, false};
}

} // namespace kelo::platform
