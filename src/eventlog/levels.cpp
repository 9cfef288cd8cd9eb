#include <array>
#include <cstdio>

#include "common/failure.h"
#include "kelosyslog/logger.h"

namespace {

constexpr std::array<const char *, 3> kLevelNames = {"Information", "Warning", "Error"};

const char *LevelName(int level) {
    return level >= 0 && level < static_cast<int>(kLevelNames.size())
               ? kLevelNames[static_cast<size_t>(level)]
               : "";
}

} // namespace

std::string strLevelGet(int level) {
    return LevelName(level);
}

int szLevelGet(int level, char *buffer, int size) {
    if (buffer == nullptr)
        return kelo::Fail(KELO_FAILURE_ARGUMENT, "", "szLevelGet", "a null pointer");
    if (size > 0)
        std::snprintf(buffer, static_cast<size_t>(size), "%s", LevelName(level));
    return 0;
}
