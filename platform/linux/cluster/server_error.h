#pragma once

#include <string>
#include <string_view>

#include "cluster/cluster_error.h"

namespace kelo::platform {

// An error that a server reports itself.
struct ServerError : ClusterError {
    ServerError(KELOFAILUREKIND kind, const std::string &text, bool isAboutAnother)
        : ClusterError(kind, text), isAboutAnother(isAboutAnother) {}
    // It cannot reach a server that has a part of the data.
    bool isAboutAnother;
};

// What the server at `url` means with a status other than 200 and its text.
ServerError ErrorOfServer(const std::string &url, long status, std::string_view text);

} // namespace kelo::platform
