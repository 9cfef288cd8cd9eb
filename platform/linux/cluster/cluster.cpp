#include "cluster/cluster.h"

#include <climits>
#include <cstdlib>

#include "cluster/partial_answers.h"
#include "cluster/server_error.h"

namespace kelo::platform {
namespace {

// Collects one column of numbers.
class NumberTaker final : public RowTaker {
public:
    void TakeColumns(const std::vector<std::string> &) override {}
    void TakeRow(std::span<const std::string> values) override {
        numbers.push_back(std::strtoull(values[0].c_str(), nullptr, 10));
    }
    std::vector<uint64_t> numbers;
};

std::string WithRowEnd(std::string sql) {
    const std::string column = ", '" + std::string(kRowEnd) + "'";
    return sql.insert(sql.find(" FROM "), column) + " FORMAT TabSeparated";
}

// A count for a caller who takes it for one of 32 bits must not become another number.
class SmallCountTaker final : public RowTaker {
public:
    explicit SmallCountTaker(RowTaker &rows) : rows_(rows) {}
    void TakeColumns(const std::vector<std::string> &names) override { rows_.TakeColumns(names); }
    void TakeRow(std::span<const std::string> values) override {
        if (std::strtoull(values[0].c_str(), nullptr, 10) > INT_MAX)
            throw ClusterError(KELO_FAILURE_OTHER,
                               "there are " + values[0] + " rows, more than this count can give");
        rows_.TakeRow(values);
    }

private:
    RowTaker &rows_;
};

} // namespace

// The engine knows no offset without a limit.
std::string Cluster::Page::Clause() const {
    if (limit == 0 && offset == 0)
        return "";
    return " LIMIT " + std::to_string(offset) + ", " +
           std::to_string(limit != 0 ? limit : uint64_t{INT64_MAX});
}

Cluster::Cluster(const std::string &path) : configuration_(ReadClusterConfiguration(path)) {}

HttpClient &Cluster::Client() {
    if (client_ == nullptr)
        client_ = std::make_unique<HttpClient>(configuration_);
    return *client_;
}

// The next server is asked if one cannot be reached at all.
void Cluster::AskOneServer(const std::string &user, const std::string &sql, const HttpClient::Taker &take) {
    std::string failures;
    for (size_t tries = 0; tries < configuration_.urls.size(); ++tries) {
        try {
            return Client().Run(configuration_.urls[server_], user, sql, take);
        } catch (const ServerError &) {
            throw;
        } catch (const ClusterError &error) {
            if (client_ == nullptr || !client_->HasNotSent())
                throw;
            failures.append(failures.empty() ? "" : "; ").append(error.what());
            server_ = (server_ + 1) % configuration_.urls.size();
        }
    }
    throw ClusterError(KELO_FAILURE_IO, "no server of the cluster can be reached: " + failures);
}

void Cluster::AskAs(const std::string &user, const std::string &sql, size_t columns, RowTaker &rows) {
    AnswerReader reader(columns, rows);
    AskOneServer(user, WithRowEnd(sql), [&](std::string_view part) { reader.Take(part); });
    reader.Finish();
}

void Cluster::Ask(const std::string &sql, size_t columns, RowTaker &rows) {
    try {
        AskAs(configuration_.user, sql, columns, rows);
    } catch (const ServerError &error) {
        if (!error.isAboutAnother || !ArePartialAnswersWanted())
            throw;
        if (configuration_.partialUser.empty())
            throw ClusterError(error.kind,
                               std::string(error.what()) +
                                   "; for a part of the answer the file needs a line 'partial-user='");
        AskAs(configuration_.partialUser, sql, columns, rows);
        NoteMissingPart(error.what());
    }
}

std::vector<uint64_t> Cluster::AskNumbers(const std::string &sql) {
    NumberTaker taker;
    Ask(sql, 1, taker);
    return std::move(taker.numbers);
}

uint64_t Cluster::AskNumber(const std::string &sql) {
    const std::vector<uint64_t> numbers = AskNumbers(sql);
    if (numbers.size() != 1)
        throw ClusterError(KELO_FAILURE_IO, "a server gave no number for " + sql);
    return numbers.front();
}

void Cluster::Run(std::string_view sql, const std::optional<Page> &page, RowTaker &rows) {
    const Translation translation = Translate(sql, configuration_.database);
    if (page &&
        (translation.kind == Translation::Kind::kPageById || translation.kind == Translation::Kind::kDelete))
        throw ClusterError(KELO_FAILURE_STATEMENT, "only a SELECT without bounds of its own can be limited");
    switch (translation.kind) {
    case Translation::Kind::kRows:
        return RunRows(translation, page.value_or(Page{}), rows);
    case Translation::Kind::kPageById:
        return RunPageById(translation, rows);
    case Translation::Kind::kDelete:
        return Delete(translation);
    case Translation::Kind::kAnswer:
        break;
    }
    rows.TakeColumns(translation.columns);
    const std::string limited = translation.sql + page.value_or(Page{}).Clause();
    if (!translation.isCount32)
        return Ask(limited, translation.columns.size(), rows);
    SmallCountTaker small(rows);
    Ask(limited, translation.columns.size(), small);
}

} // namespace kelo::platform
