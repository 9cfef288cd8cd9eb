#pragma once

#include <stdexcept>
#include <string>

#include "keloplatform/failure.h"

namespace kelo::platform {

// Why a cluster gave no answer. The text is one line.
struct ClusterError : std::runtime_error {
    ClusterError(KELOFAILUREKIND kind, const std::string &text) : std::runtime_error(text), kind(kind) {}
    KELOFAILUREKIND kind;
};

} // namespace kelo::platform
