#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "base/errors.h"

struct DBConnect_tag;

namespace kelo::tool {

// The servers that a description of a cluster names, asked in their own language. One thread at a time uses
// an object.
class EngineServers {
public:
    // `path` describes the cluster. Throws UsageError, naming `option`, if it does not, and DatabaseError if
    // the description is wrong.
    EngineServers(const std::string &path, const std::string &option);
    ~EngineServers();
    EngineServers(const EngineServers &) = delete;
    EngineServers &operator=(const EngineServers &) = delete;

    size_t Count() const { return urls_.size(); }
    const std::string &Url(size_t server) const { return urls_[server]; }

    // Runs a statement on a server, once, and returns the bytes of its answer. Throws DatabaseError; if the
    // answer was lost the statement may have been carried out.
    std::string Run(size_t server, std::string_view statement);
    // An answer of texts without tabs and line feeds, row by row.
    using Rows = std::vector<std::vector<std::string>>;
    Rows Ask(size_t server, const std::string &statement);
    // An answer of one row with `count` numbers.
    std::vector<uint64_t> AskNumbers(size_t server, const std::string &statement, size_t count);

private:
    struct Close {
        void operator()(DBConnect_tag *connection) const;
    };
    std::string path_;
    std::unique_ptr<DBConnect_tag, Close> connection_;
    std::vector<std::string> urls_;
};

} // namespace kelo::tool
