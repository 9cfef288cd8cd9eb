#include "spool/progress.h"

#include <algorithm>
#include <stdexcept>

#include "base/json.h"

namespace kelo::tool {
namespace {

constexpr int64_t kFirstDelaySec = 15;
constexpr int64_t kLongestDelaySec = 3600;

} // namespace

void NoteFailure(Attempts &attempts, const std::string &reason, int64_t now) {
    const int doublings = std::min(attempts.failures, 8);
    attempts.failures += 1;
    attempts.next = now + std::min(kFirstDelaySec << doublings, kLongestDelaySec);
    attempts.reason = reason;
}

Progress ParseProgress(const std::string &content) try {
    const Json::Value root = ParseJson(content);
    Progress progress;
    progress.since = root["since"].asInt64();
    progress.reason = root["reason"].asString();
    const Json::Value &targets = root["targets"];
    for (const std::string &name : targets.getMemberNames()) {
        const Json::Value &target = targets[name];
        progress.targets[name] = {target["done"].asBool(), target["failures"].asInt(),
                                  target["next"].asInt64(), target["reason"].asString()};
    }
    return progress;
} catch (const Json::Exception &) {
    throw std::runtime_error("damaged progress file");
}

std::string ToJson(const Progress &progress) {
    Json::Value root;
    root["version"] = 1;
    root["since"] = static_cast<Json::Int64>(progress.since);
    root["reason"] = progress.reason;
    root["targets"] = Json::objectValue;
    for (const auto &[name, attempts] : progress.targets) {
        Json::Value &target = root["targets"][name];
        target["done"] = attempts.isDone;
        target["failures"] = attempts.failures;
        target["next"] = static_cast<Json::Int64>(attempts.next);
        target["reason"] = attempts.reason;
    }
    return WriteJsonLine(root);
}

} // namespace kelo::tool
