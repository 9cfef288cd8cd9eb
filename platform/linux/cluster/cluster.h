#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "cluster/answer.h"
#include "cluster/cluster_error.h"
#include "cluster/configuration.h"
#include "cluster/http_client.h"
#include "cluster/translation.h"

namespace kelo::platform {

// A cluster of servers in the place of a database of SQLite. It answers the statements that are sent to a log
// database, and refuses every other one. Each statement asks one server, which asks the others; the first
// that can be reached is asked.
class Cluster {
public:
    // Reads the file that describes it; no server is asked. Throws ClusterError.
    explicit Cluster(const std::string &path);
    Cluster(const Cluster &) = delete;
    Cluster &operator=(const Cluster &) = delete;

    // The rows to skip, and then to take at most; a limit of 0 means all.
    struct Page {
        uint64_t limit = 0;
        uint64_t offset = 0;
        // The clause of the engine; "" for all rows.
        std::string Clause() const;
    };

    // Runs a statement as SQLite would, and hands its rows to `rows`. Throws ClusterError: then the rows so
    // far are no answer. Also throws what `rows` throws.
    void Run(std::string_view sql, const std::optional<Page> &page, RowTaker &rows);

    const std::vector<std::string> &Servers() const { return configuration_.urls; }

    // Sends a statement of the engine to one server, as it is and once. Throws ClusterError, and what `take`
    // throws.
    void RunAsItIs(size_t server, std::string_view statement, const HttpClient::Taker &take) {
        Client().RunOnce(configuration_.urls.at(server), configuration_.user, statement, take);
    }

private:
    void Ask(const std::string &sql, size_t columns, RowTaker &rows);
    void AskAs(const std::string &user, const std::string &sql, size_t columns, RowTaker &rows);
    void AskOneServer(const std::string &user, const std::string &sql, const HttpClient::Taker &take);
    std::vector<uint64_t> AskNumbers(const std::string &sql);
    uint64_t AskNumber(const std::string &sql);
    HttpClient &Client();

    // row_page.cpp
    void RunRows(const Translation &rows, const Page &page, RowTaker &taker);
    void RunPageById(const Translation &page, RowTaker &taker);
    void TakeRows(const Translation &rows, const std::vector<uint64_t> &ids, RowTaker &taker,
                  const std::string &furtherColumn = "");
    std::vector<uint64_t> IdsOfPage(const Translation &rows, const Page &page);

    // deletion.cpp
    void Delete(const Translation &rows);
    void AwaitDeletion(const std::string &url);

    std::string Table() const { return configuration_.database + ".logs"; }

    ClusterConfiguration configuration_;
    std::unique_ptr<HttpClient> client_; // once it is needed
    size_t server_ = 0;                  // index of the one that answered last
};

} // namespace kelo::platform
