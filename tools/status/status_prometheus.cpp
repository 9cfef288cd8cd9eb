#include "status/status_prometheus.h"

#include <cstdio>
#include <utility>
#include <vector>

#include "base/text_encoding.h"

namespace kelo::tool {
namespace {

using Labels = std::vector<std::pair<const char *, std::string>>;

std::string Escape(const std::string &value) {
    std::string escaped;
    for (const char byte : EscapeForTerminal(value)) { // leaves no line feed
        if (byte == '\\' || byte == '"')
            escaped += '\\';
        escaped += byte;
    }
    return escaped;
}

class Metrics {
public:
    // Begins a metric; its samples follow. One whose name ends in "_total" is a counter.
    void Begin(const std::string &name, const std::string &help) {
        name_ = "kelosyslog_" + name;
        head_ = "# HELP " + name_ + " " + help + "\n# TYPE " + name_ +
                (name_.ends_with("_total") ? " counter\n" : " gauge\n");
    }
    void Add(const Labels &labels, double value) {
        text_ += std::exchange(head_, "") + name_; // without a sample it has no head either
        for (size_t i = 0; i < labels.size(); ++i)
            text_ +=
                (i == 0 ? "{" : ",") + std::string(labels[i].first) + "=\"" + Escape(labels[i].second) + "\"";
        char number[32];
        std::snprintf(number, sizeof number, "%.17g", value);
        text_ += (labels.empty() ? " " : "} ") + std::string(number) + "\n";
    }
    void Add(const Labels &labels, uint64_t value) { Add(labels, static_cast<double>(value)); }
    void Add(const Labels &labels, int64_t value) { Add(labels, static_cast<double>(value)); }
    void Add(const Labels &labels, bool value) { Add(labels, value ? 1.0 : 0.0); }

    template <typename Value>
    void Single(const std::string &name, const std::string &help, Value value) {
        Begin(name, help);
        Add({}, value);
    }
    // A sample for each of `items`; `labels` and `value` are called with one.
    template <typename Items, typename LabelsOf, typename ValueOf>
    void Each(const std::string &name, const std::string &help, const Items &items, LabelsOf labels,
              ValueOf value) {
        Begin(name, help);
        for (const auto &item : items)
            Add(labels(item), value(item));
    }

    const std::string &Text() const { return text_; }

private:
    std::string name_;
    std::string head_;
    std::string text_;
};

void AddSyslogNg(Metrics &metrics, const SyslogNgStatus &status) {
    metrics.Single("syslog_ng_running", "Whether syslog-ng runs and answers.",
                   status.state == SyslogNgStatus::State::Running);
    if (status.since != 0)
        metrics.Single("syslog_ng_start_time_seconds", "Start of syslog-ng.", status.since);
    metrics.Single("syslog_ng_above_rate_messages_total", "Messages that the rate limit dropped.",
                   status.aboveRate);
    metrics.Single("syslog_ng_refused_tls_connections_total", "Connections over TLS that were refused.",
                   status.refusedTls);
    using Counters = SyslogNgCounters;
    const auto source = [](const Counters &one) { return Labels{{"source", one.id}}; };
    const auto destination = [](const Counters &one) {
        return Labels{{"destination", one.id}, {"instance", one.instance}};
    };
    metrics.Each("syslog_ng_received_messages_total", "Messages that a source of syslog-ng received.",
                 status.sources, source, [](const Counters &one) { return one.processed; });
    const auto each = [&](const char *name, const char *help, auto value) {
        metrics.Each(name, help, status.destinations, destination, value);
    };
    each("syslog_ng_processed_messages_total", "Messages that reached a destination of syslog-ng.",
         [](const Counters &one) { return one.processed; });
    each("syslog_ng_written_messages_total", "Messages that a destination of syslog-ng wrote.",
         [](const Counters &one) { return one.written; });
    each("syslog_ng_dropped_messages_total", "Messages that a destination of syslog-ng lost.",
         [](const Counters &one) { return one.dropped; });
    each("syslog_ng_queued_messages", "Messages that wait for a destination of syslog-ng.",
         [](const Counters &one) { return one.queued; });
    each("syslog_ng_stuck", "Whether a destination of syslog-ng writes nothing although messages wait.",
         [](const Counters &one) { return one.isStuck; });
}

void AddListeners(Metrics &metrics, const std::vector<Listener> &listeners) {
    const auto add = [&](const char *name, const char *help, bool isOfTcp, bool isOfUdp, auto value) {
        metrics.Begin(name, help);
        for (const Listener &one : listeners) {
            if (one.isTcp ? isOfTcp : isOfUdp)
                metrics.Add({{"protocol", one.isTcp ? "tcp" : "udp"},
                             {"address", one.address},
                             {"port", std::to_string(one.port)}},
                            value(one));
        }
    };
    add("listener_open", "Whether syslog-ng listens.", true, true,
        [](const Listener &one) { return one.isOpen; });
    add("listener_connections", "Connections of devices.", true, false,
        [](const Listener &one) { return one.connections; });
    add("listener_most_connections", "Connections above which devices are turned away; 0 for unknown.", true,
        false, [](const Listener &one) { return one.mostConnections; });
    add("listener_dropped_datagrams_total", "Datagrams that the kernel dropped.", false, true,
        [](const Listener &one) { return one.drops; });
}

void AddReceiver(Metrics &metrics, const ReceiverStatus &status) {
    using State = ReceiverStatus::State;
    metrics.Single("receiver_running", "Whether the receiver runs and reports.",
                   status.state == State::Running);
    const ReceiverState &told = status.told;
    if (told.started == 0)
        return;
    metrics.Single("receiver_start_time_seconds", "Start of the receiver.", told.started);
    metrics.Single("receiver_waiting", "Whether the receiver cannot go on.", !told.waiting.empty());
    metrics.Single("receiver_records_total", "Complete records.", told.received);
    metrics.Single("receiver_stored_records_total", "Records that the receiver stored itself.", told.stored);
    metrics.Single("receiver_spool_unread_bytes", "Bytes of the message spool that are not stored yet.",
                   told.spool.unread);
    metrics.Single("receiver_spool_limit_bytes", "Size from which on the message spool is closed.",
                   told.spool.limit);
    metrics.Begin("receiver_set_aside_lines_total", "Lines that gave no record.");
    uint64_t incomplete = 0;
    for (const auto &[field, count] : told.incomplete)
        incomplete += count;
    metrics.Add({{"reason", "incomplete"}}, incomplete);
    metrics.Add({{"reason", "rejected"}}, told.rejected);
    metrics.Add({{"reason", "overlong"}}, told.overlong);
    metrics.Single("receiver_other_devices_records_total", "Records of devices above the limit of names.",
                   told.others);
    metrics.Single("receiver_suppressed_matches_total",
                   "Matches of rules without a notification of their own.", told.suppressed);
    metrics.Single("receiver_lost_notifications_total", "Notifications of rules that were given up.",
                   told.lostNotifications);
}

void AddDatabases(Metrics &metrics, const ServerStatus &status) {
    using Database = DatabaseStatus;
    const auto database = [](const Database &one) { return Labels{{"database", one.name}}; };
    metrics.Each("database_good", "Whether the parts of a database that were read are intact.",
                 status.databases, database,
                 [](const Database &one) { return one.state == Database::State::Good; });
    metrics.Each("database_size_bytes", "Size of a database.", status.databases, database,
                 [](const Database &one) { return one.size; });
    metrics.Each("database_wal_size_bytes", "Size of the write-ahead log of a database.", status.databases,
                 database, [](const Database &one) { return one.walSize; });
    const auto known = [&](const char *name, const char *help, std::optional<int64_t> Database::*value) {
        metrics.Begin(name, help);
        for (const Database &one : status.databases)
            if (one.*value)
                metrics.Add(database(one), *(one.*value));
    };
    known("database_rows", "Rows of a database; an estimate above 100000.", &Database::rows);
    known("database_oldest_time_seconds", "Time of the oldest row.", &Database::first);
    known("database_newest_time_seconds", "Time of the newest row.", &Database::last);
    known("database_set_aside_bytes", "Size of the damaged database that was put aside.",
          &Database::quarantined);
    metrics.Single("archives", "Number of archives.", status.archives.files);
    metrics.Single("archives_size_bytes", "Size of all archives.", status.archives.size);
    if (status.accounting)
        metrics.Single("records_total", "Records that were counted.", status.accounting->total);
}

void AddNotifications(Metrics &metrics, const NotificationStatus &status) {
    metrics.Single("notifications_waiting", "Notifications that wait.", uint64_t{status.waiting});
    metrics.Single("notifications_failed", "Notifications that were given up.", uint64_t{status.failed});
    metrics.Begin("channel_working", "Whether a channel that is switched on works.");
    for (const ChannelHealth &channel : status.channels)
        if (channel.isOn)
            metrics.Add({{"channel", channel.name}}, channel.problem.empty());
}

} // namespace

std::string StatusPrometheus(const ServerStatus &status) {
    Metrics metrics;
    metrics.Single("status_time_seconds", "Time of this check.", status.time);
    metrics.Single("attention", "Number of things that need attention.", uint64_t{status.attention.size()});
    AddSyslogNg(metrics, status.syslogNg);
    AddListeners(metrics, status.network.listeners);
    AddReceiver(metrics, status.receiver);
    if (status.messageSpool.bytes)
        metrics.Single("message_spool_bytes", "Size of the files in the message spool.",
                       *status.messageSpool.bytes);
    AddDatabases(metrics, status);
    metrics.Single("retention_followed", "Whether there is a rule of retention and it is followed.",
                   status.retention.rule && status.retention.problem.empty());
    metrics.Single("receiving_stopped", "Whether the retention has stopped receiving.",
                   status.retention.isReceptionStopped);
    AddNotifications(metrics, status.notifications);
    const auto folder = [](const VolumeStatus &one) { return Labels{{"folder", one.folders.front()}}; };
    metrics.Each("volume_size_bytes", "Size of a volume.", status.volumes, folder,
                 [](const VolumeStatus &one) { return one.size; });
    metrics.Each("volume_free_bytes", "Free space of a volume.", status.volumes, folder,
                 [](const VolumeStatus &one) { return one.free; });
    return metrics.Text();
}

} // namespace kelo::tool
