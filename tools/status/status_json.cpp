#include "status/status_json.h"

#include "base/json.h"
#include "status/state_names.h"

namespace kelo::tool {
namespace {

using Json::Value;

Value Number(int64_t number) {
    return Json::Int64{number};
}
Value Count(uint64_t number) {
    return Json::UInt64{number};
}
// A time or a process; 0 means unknown.
Value Known(int64_t number) {
    return number != 0 ? Number(number) : Value();
}
Value Known(const std::optional<int64_t> &number) {
    return number ? Number(*number) : Value();
}

Value ToJson(const SyslogNgStatus &status) {
    Value json;
    json["state"] = StateName(status.state);
    json["control"] = status.control;
    json["pid"] = Known(status.pid);
    json["since"] = Known(status.since);
    json["problem"] = status.problem;
    const bool areTold = status.state == SyslogNgStatus::State::Running && status.problem.empty();
    json["received"] = areTold ? Count(status.Received()) : Value();
    json["dropped"] = areTold ? Count(status.Dropped()) : Value();
    json["above_rate"] = areTold ? Count(status.aboveRate) : Value();
    json["refused_tls"] = areTold ? Count(status.refusedTls) : Value();
    json["sources"] = Json::arrayValue;
    for (const SyslogNgCounters &source : status.sources) {
        Value &item = json["sources"].append(Value());
        item["id"] = source.id;
        item["processed"] = Count(source.processed);
    }
    json["destinations"] = Json::arrayValue;
    for (const SyslogNgCounters &destination : status.destinations) {
        Value &item = json["destinations"].append(Value());
        item["driver"] = destination.driver;
        item["id"] = destination.id;
        item["instance"] = destination.instance;
        item["processed"] = Count(destination.processed);
        item["written"] = Count(destination.written);
        item["dropped"] = Count(destination.dropped);
        item["queued"] = Count(destination.queued);
        item["stuck"] = destination.isStuck;
        item["memory_bytes"] = Count(destination.memory);
    }
    return json;
}

Value ToJson(const Listener &listener) {
    Value json;
    json["protocol"] = listener.isTcp ? "tcp" : "udp";
    json["address"] = listener.address;
    json["port"] = Number(listener.port);
    json["families"] = listener.Families();
    json["form"] = listener.form;
    json["encryption"] = listener.isTls ? "TLS" : "";
    json["configured"] = listener.isConfigured;
    json["open"] = listener.isKnown ? Value(listener.isOpen) : Value();
    json["connections"] = Count(listener.connections);
    json["most_connections"] = listener.mostConnections != 0 ? Count(listener.mostConnections) : Value();
    json["kernel_drops"] = Count(listener.drops);
    return json;
}

Value ToJson(const ReceiverStatus &status) {
    const ReceiverState &told = status.told;
    Value json;
    json["state"] = StateName(status.state);
    json["pid"] = Known(told.pid);
    json["started"] = Known(told.started);
    json["updated"] = Known(told.updated);
    json["ended"] = Known(told.ended);
    json["eps"] = told.eps;
    json["received"] = Count(told.received);
    json["incomplete"] = Json::objectValue;
    for (const auto &[field, count] : told.incomplete)
        json["incomplete"][field] = Count(count);
    json["rejected"] = Count(told.rejected);
    json["overlong"] = Count(told.overlong);
    json["stored"] = Count(told.stored);
    json["database"] = told.database;
    json["suppressed"] = Count(told.suppressed);
    json["lost_notifications"] = Count(told.lostNotifications);
    json["other_devices"] = Count(told.others);
    json["waiting"] = told.waiting;
    Value &spool = json["spool"];
    spool["folder"] = told.spool.folder;
    spool["bytes"] = Count(told.spool.bytes);
    spool["limit_bytes"] = Count(told.spool.limit);
    spool["unread_bytes"] = Count(told.spool.unread);
    spool["behind_sec"] = Json::Int64{told.spool.behindSec};
    spool["growth"] = told.spool.growth;
    spool["full_in_sec"] = Known(told.spool.LastsSec());
    return json;
}

Value ToJson(const MessageSpoolStatus &status) {
    Value json;
    json["folder"] = status.folder;
    json["bytes"] = status.bytes ? Count(*status.bytes) : Value();
    return json;
}

Value ToJson(const DatabaseStatus &status) {
    Value json;
    json["name"] = status.name;
    json["path"] = status.path;
    json["table"] = status.table;
    json["state"] = StateName(status.state);
    json["problem"] = status.problem;
    json["size_bytes"] = Number(status.size);
    json["wal_bytes"] = Number(status.walSize);
    json["rows"] = Known(status.rows);
    json["rows_estimated"] = status.isEstimate;
    json["first"] = Known(status.first);
    json["last"] = Known(status.last);
    json["index_bytes"] = Known(status.indexSize);
    json["unindexed_rows"] = Known(status.unindexed);
    json["quarantined_bytes"] = Known(status.quarantined);
    return json;
}

Value ToJson(const ArchiveStatus &status) {
    Value json;
    json["path"] = status.path;
    json["files"] = Number(status.files);
    json["size_bytes"] = Number(status.size);
    json["problem"] = status.problem;
    return json;
}

Value ToJson(const RetentionStatus &status) {
    Value json;
    json["rule"] = status.rule ? DescribeRetention(*status.rule) : "";
    json["problem"] = status.problem;
    json["receiving_stopped"] = status.isReceptionStopped;
    return json;
}

Value ToJson(const AccountingStatus &status) {
    Value json;
    json["newest"] = Known(status.newest);
    json["eps_minute"] = status.perSecond;
    json["eps_hour"] = status.perSecondHour;
    json["total"] = Count(status.total);
    json["devices"] = Json::arrayValue;
    for (const auto &[device, count] : status.devices) {
        Value &item = json["devices"].append(Value());
        item["device"] = device;
        item["count"] = Count(count);
    }
    return json;
}

Value ToJson(const NotificationStatus &status) {
    Value json;
    json["path"] = status.path;
    json["waiting"] = Count(status.waiting);
    json["failed"] = Count(status.failed);
    json["oldest"] = Known(status.oldest);
    json["problem"] = status.problem;
    json["channels"] = Json::objectValue;
    for (const ChannelHealth &channel : status.channels) {
        Value &item = json["channels"][channel.name];
        item["enabled"] = channel.isOn;
        item["problem"] = channel.problem;
        item["next"] = Known(channel.next);
    }
    return json;
}

Value ToJson(const Event &event) {
    Value json;
    json["id"] = event.id;
    json["time"] = Number(event.time);
    json["level"] = EventLevelName(event.level);
    json["user"] = event.user;
    json["event"] = event.event;
    return json;
}

Value ToJson(const std::string &text) {
    return text;
}

Value ToJson(const VolumeStatus &status) {
    Value json;
    json["folders"] = Json::arrayValue;
    for (const std::string &folder : status.folders)
        json["folders"].append(folder);
    json["state"] = StateName(status.FreeLevel());
    json["size_bytes"] = Count(status.size);
    json["free_bytes"] = Count(status.free);
    json["free_percent"] = status.FreePercent();
    return json;
}

Value ToArray(const auto &items) {
    Value json(Json::arrayValue);
    for (const auto &item : items)
        json.append(ToJson(item));
    return json;
}

} // namespace

std::string StatusJson(const ServerStatus &status) {
    Value json;
    json["time"] = Number(status.time);
    json["well"] = status.attention.empty();
    json["attention"] = ToArray(status.attention);
    json["syslog_ng"] = ToJson(status.syslogNg);
    json["listening"] = ToArray(status.network.listeners);
    json["receiver"] = ToJson(status.receiver);
    json["message_spool"] = ToJson(status.messageSpool);
    json["databases"] = ToArray(status.databases);
    json["archives"] = ToJson(status.archives);
    json["retention"] = ToJson(status.retention);
    json["accounting"] = status.accounting ? ToJson(*status.accounting) : Value();
    json["notifications"] = ToJson(status.notifications);
    json["events"] = ToArray(status.events);
    json["volumes"] = ToArray(status.volumes);
    return WriteJsonLine(json, JsonTexts::kAscii);
}

} // namespace kelo::tool
