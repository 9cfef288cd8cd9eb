#include "cluster/table_check.h"

#include <algorithm>
#include <map>
#include <sstream>

#include "cluster/cluster_tables.h"
#include "cluster/server_answers.h"

namespace kelo::tool {
namespace {

// The texts of the engine for what it has read from schema/cluster.sql.
struct Table {
    const char *name;
    const char *engine; // is a part of it
    const char *partitionKey;
    const char *sortingKey;
};
constexpr Table kTables[] = {{"logs_shard", "ReplacingMergeTree", "toYYYYMMDD(toDateTime(utcsec))", "id"},
                             {"logs", "Distributed", "", ""}};

void FindWrongTables(EngineServers &servers, size_t server, std::vector<std::string> &problems) {
    std::map<std::string, std::vector<std::string>> found;
    for (const std::vector<std::string> &row :
         servers.Ask(server, "SELECT name, engine, partition_key, sorting_key FROM system.tables WHERE "
                             "database = currentDatabase()"))
        found[row[0]] = row;
    for (const Table &table : kTables) {
        const std::string name = std::string("table ") + table.name;
        const auto one = found.find(table.name);
        if (one == found.end()) {
            problems.push_back(name + " is missing");
            continue;
        }
        const std::vector<std::string> &row = one->second;
        if (row[1].find(table.engine) == std::string::npos)
            problems.push_back(name + " has the engine " + row[1] + " instead of " + table.engine);
        else if (row[2] != table.partitionKey || row[3] != table.sortingKey)
            problems.push_back(name + " has partitions by '" + row[2] + "' in the order of '" + row[3] +
                               "' instead of '" + table.partitionKey + "' and '" + table.sortingKey + "'");
    }
}

void FindWrongColumns(EngineServers &servers, size_t server, std::vector<std::string> &problems) {
    const EngineServers::Rows rows = servers.Ask(
        server, "SELECT table, name, type FROM system.columns WHERE database = currentDatabase()");
    for (const ClusterColumn &column : ClusterColumns()) {
        const auto isTable = [&](const std::vector<std::string> &row) { return row[0] == column.table; };
        const auto row = std::find_if(rows.begin(), rows.end(), [&](const std::vector<std::string> &row) {
            return isTable(row) && row[1] == column.name;
        });
        const std::string name = "column " + column.name + " of " + column.table;
        if (row != rows.end() && (*row)[2] != column.type)
            problems.push_back(name + " is " + (*row)[2] + " instead of " + column.type);
        else if (row == rows.end() && std::any_of(rows.begin(), rows.end(), isTable))
            problems.push_back(name + " is missing");
    }
}

// The engine rewrites the expression, so it is tried.
void FindWrongId(EngineServers &servers, size_t server, std::vector<std::string> &problems) {
    const EngineServers::Rows rows = servers.Ask(
        server,
        "SELECT default_kind, default_expression FROM system.columns WHERE database = currentDatabase() AND "
        "table = 'logs_shard' AND name = 'id'");
    if (rows.empty())
        return;
    constexpr uint64_t kId = uint64_t{1600000005} << 30 | uint64_t{200} << 22 | 77;
    const bool isMade = rows[0][0] == "MATERIALIZED" &&
                        AskOne(servers, server,
                               "SELECT toString(" + rows[0][1] +
                                   ") FROM (SELECT toInt64(1600000005) AS utcsec, toUInt8(200) AS node, "
                                   "toUInt64(4194304 + 77) AS rcptid)") == std::to_string(kId);
    if (!isMade)
        problems.push_back("column id of logs_shard is made otherwise: " + rows[0][0] + " " + rows[0][1]);
}

} // namespace

std::vector<ClusterColumn> ClusterColumns() {
    constexpr std::string_view kTable = "CREATE TABLE IF NOT EXISTS kelo.";
    constexpr std::string_view kIndent = "    ";
    std::vector<ClusterColumn> columns;
    std::istringstream lines(kClusterTables);
    std::string line;
    std::string table;
    while (std::getline(lines, line)) {
        if (line.starts_with(kTable))
            table = line.substr(kTable.size(), line.find(' ', kTable.size()) - kTable.size());
        // Further indented is the rest of an expression.
        if (!line.starts_with(kIndent) || line[kIndent.size()] == ' ')
            continue;
        std::istringstream words(line);
        ClusterColumn column{table, "", ""};
        words >> column.name >> column.type;
        if (column.type.ends_with(','))
            column.type.pop_back();
        columns.push_back(column);
    }
    return columns;
}

std::vector<std::string> FindTableProblems(EngineServers &servers, size_t server) {
    std::vector<std::string> problems;
    FindWrongTables(servers, server, problems);
    FindWrongColumns(servers, server, problems);
    FindWrongId(servers, server, problems);
    return problems;
}

} // namespace kelo::tool
