#include "cluster/engine_servers.h"

#include <filesystem>

#include "base/number_text.h"
#include "keloplatform/cluster.h"
#include "keloplatform/failure.h"
#include "keloplatform/kelodb.h"

namespace kelo::tool {
namespace {

int TakeBytes(const char *bytes, size_t size, void *answer) {
    static_cast<std::string *>(answer)->append(bytes, size);
    return 0;
}

std::vector<std::string> SplitAt(char separator, std::string_view text) {
    std::vector<std::string> parts;
    for (size_t end = text.find(separator); end != std::string_view::npos; end = text.find(separator)) {
        parts.emplace_back(text.substr(0, end));
        text.remove_prefix(end + 1);
    }
    parts.emplace_back(text);
    return parts;
}

} // namespace

void EngineServers::Close::operator()(DBConnect_tag *connection) const {
    KELODBClose(connection);
}

EngineServers::EngineServers(const std::string &path, const std::string &option)
    : path_(path.empty() ? path : std::filesystem::absolute(path).string()) {
    std::error_code error;
    if (!path_.empty() && !std::filesystem::exists(path_, error))
        throw UsageError(option + ": " + path_ + ": no such file");
    if (KELODBIsCluster(path_.c_str()) == 0)
        throw UsageError(option + ": '" + path + "' does not describe a cluster");
    connection_.reset(KELODBConnect(nullptr, nullptr, nullptr, path_.c_str()));
    if (connection_ == nullptr)
        throw DatabaseError(path_ + ": " + KELOFailureGet()->text);
    while (const char *url =
               KELODBClusterServerGet(connection_.get(), static_cast<unsigned int>(urls_.size())))
        urls_.emplace_back(url);
}

EngineServers::~EngineServers() = default;

std::string EngineServers::Run(size_t server, std::string_view statement) {
    std::string answer;
    if (KELODBClusterRun(connection_.get(), static_cast<unsigned int>(server), statement.data(),
                         statement.size(), TakeBytes, &answer) != 0)
        throw DatabaseError(path_ + ": " + KELODBErrorGet(connection_.get()));
    return answer;
}

EngineServers::Rows EngineServers::Ask(size_t server, const std::string &statement) {
    std::string answer = Run(server, statement + " FORMAT TabSeparated");
    Rows rows;
    if (answer.empty())
        return rows;
    if (answer.back() != '\n')
        throw DatabaseError(path_ + ": the answer of " + Url(server) + " is not whole");
    answer.pop_back();
    for (const std::string &line : SplitAt('\n', answer))
        rows.push_back(SplitAt('\t', line));
    return rows;
}

std::vector<uint64_t> EngineServers::AskNumbers(size_t server, const std::string &statement, size_t count) {
    const Rows rows = Ask(server, statement);
    if (rows.size() != 1 || rows.front().size() != count)
        throw DatabaseError(path_ + ": " + Url(server) + " gave no numbers for " + statement);
    std::vector<uint64_t> numbers;
    for (const std::string &number : rows.front())
        numbers.push_back(UnsignedNumber(number));
    return numbers;
}

} // namespace kelo::tool
