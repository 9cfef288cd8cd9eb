#include "receive/receiver_state.h"

#include <filesystem>
#include <system_error>

#include "base/folder.h"
#include "base/json.h"

namespace kelo::tool {
namespace {

Json::Value ToJson(const ReceiverState &state) {
    Json::Value root;
    root["version"] = 1;
    root["pid"] = Json::Int64{state.pid};
    root["started"] = Json::Int64{state.started};
    root["updated"] = Json::Int64{state.updated};
    root["ended"] = Json::Int64{state.ended};
    root["received"] = Json::UInt64{state.received};
    root["incomplete"] = Json::objectValue;
    for (const auto &[field, count] : state.incomplete)
        root["incomplete"][field] = Json::UInt64{count};
    root["rejected"] = Json::UInt64{state.rejected};
    root["overlong"] = Json::UInt64{state.overlong};
    root["stored"] = Json::UInt64{state.stored};
    root["database"] = state.database;
    root["suppressed"] = Json::UInt64{state.suppressed};
    root["lost_notifications"] = Json::UInt64{state.lostNotifications};
    root["other_devices"] = Json::UInt64{state.others};
    root["waiting"] = state.waiting;
    root["eps"] = state.eps;
    if (!state.spool.folder.empty()) {
        Json::Value &spool = root["spool"];
        spool["folder"] = state.spool.folder;
        spool["bytes"] = Json::UInt64{state.spool.bytes};
        spool["limit"] = Json::UInt64{state.spool.limit};
        spool["unread"] = Json::UInt64{state.spool.unread};
        spool["behind_sec"] = Json::Int64{state.spool.behindSec};
        spool["growth"] = state.spool.growth;
    }
    return root;
}

// Throws Json::Exception for values of other types.
ReceiverState FromJson(const Json::Value &root) {
    ReceiverState state;
    state.pid = root["pid"].asInt64();
    state.started = root["started"].asInt64();
    state.updated = root["updated"].asInt64();
    state.ended = root["ended"].asInt64();
    state.received = root["received"].asUInt64();
    const Json::Value &incomplete = root["incomplete"];
    for (const std::string &field : incomplete.getMemberNames())
        state.incomplete[field] = incomplete[field].asUInt64();
    state.rejected = root["rejected"].asUInt64();
    state.overlong = root["overlong"].asUInt64();
    state.stored = root["stored"].asUInt64();
    state.database = root["database"].asString();
    state.suppressed = root["suppressed"].asUInt64();
    state.lostNotifications = root["lost_notifications"].asUInt64();
    state.others = root["other_devices"].asUInt64();
    state.waiting = root["waiting"].asString();
    state.eps = root["eps"].asDouble();
    const Json::Value &spool = root["spool"];
    state.spool.folder = spool["folder"].asString();
    state.spool.bytes = spool["bytes"].asUInt64();
    state.spool.limit = spool["limit"].asUInt64();
    state.spool.unread = spool["unread"].asUInt64();
    state.spool.behindSec = spool["behind_sec"].asInt64();
    state.spool.growth = spool["growth"].asDouble();
    return state;
}

} // namespace

std::optional<int64_t> ReceiverState::Spool::LastsSec() const {
    if (growth < 1 || limit == 0)
        return std::nullopt;
    return bytes < limit ? static_cast<int64_t>(static_cast<double>(limit - bytes) / growth) : 0;
}

std::string ReceiverStatePath(const std::string &root) {
    return root + "/run/kelosyslog/receive.json";
}

bool WriteReceiverState(const std::string &root, const ReceiverState &state) {
    const std::filesystem::path path = ReceiverStatePath(root);
    std::error_code ignored; // the write fails then, and says why
    std::filesystem::create_directories(path.parent_path(), ignored);
    const Folder folder(path.parent_path());
    const std::string name = path.filename();
    return folder.Write(name, WriteJsonLine(ToJson(state)), folder, name + ".new");
}

std::optional<ReceiverState> ReadReceiverState(const std::string &root) {
    const std::optional<std::string> content = ReadWhole(ReceiverStatePath(root));
    if (!content)
        return std::nullopt;
    try {
        const ReceiverState state = FromJson(ParseJson(*content));
        return state.pid > 0 ? std::optional(state) : std::nullopt;
    } catch (const std::exception &) {
        return std::nullopt;
    }
}

} // namespace kelo::tool
