#include <cstring>

#include "cluster/configuration.h"
#include "cluster/partial_answers.h"
#include "keloplatform/cluster.h"

namespace kelo::platform {
namespace {

thread_local bool wantsPartialAnswers = false;
thread_local std::string missingPart;

} // namespace

bool ArePartialAnswersWanted() {
    return wantsPartialAnswers;
}

void NoteMissingPart(const std::string &reason) {
    missingPart = reason;
}

} // namespace kelo::platform

void KELODBClusterPartialSet(int isWanted) {
    kelo::platform::wantsPartialAnswers = isWanted != 0;
    kelo::platform::missingPart.clear();
}

const char *KELODBClusterMissingGet() {
    return kelo::platform::missingPart.c_str();
}
