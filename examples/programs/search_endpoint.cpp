// A search endpoint: requests come on the standard input, a JSON object each, and a pool of threads answers
// them on the standard output, a line each, in any order.
//
//     {"id":1,"host":"nas,web1","keyword":"disk full","offset":50}
//     {"id":1,"logs":[{"host":"nas","id":7,"msg":"disk is full"}],"status":200,"total":51}
//
// Each thread keeps a connection. A total and its rows come from one snapshot, so they fit together beside
// any writer. A failure has a status that says who can help: 400 the caller, 503 waiting, 500 the
// administrator.
//
// usage: search_endpoint DATABASE [THREADS]

#include <json/json.h>
#include <kelosyslog/cmdparser.h>
#include <kelosyslog/dbutil.h>

#include <condition_variable>
#include <iostream>
#include <mutex>
#include <queue>
#include <thread>
#include <vector>

#include "../modern.h"

namespace {

constexpr uint64_t kPageRows = 50;

// What the threads share.
class Requests {
public:
    void Put(Json::Value request) {
        const std::lock_guard guard(mutex_);
        waiting_.push(std::move(request));
        changed_.notify_one();
    }
    void End() {
        const std::lock_guard guard(mutex_);
        hasEnded_ = true;
        changed_.notify_all();
    }
    // Waits for the next one; false when there is none any more.
    bool Take(Json::Value &request) {
        std::unique_lock guard(mutex_);
        changed_.wait(guard, [this] { return hasEnded_ || !waiting_.empty(); });
        if (waiting_.empty())
            return false;
        request = std::move(waiting_.front());
        waiting_.pop();
        return true;
    }

private:
    std::mutex mutex_;
    std::condition_variable changed_;
    std::queue<Json::Value> waiting_;
    bool hasEnded_ = false;
};

int StatusOf(KELOFAILUREKIND kind) {
    switch (kind) {
    case KELO_FAILURE_REGEX:
        return 400;
    case KELO_FAILURE_BUSY:
    case KELO_FAILURE_MISSING: // not created yet
        return 503;
    default:
        return 500;
    }
}

void Search(SyslogDBReader &reader, const Json::Value &request, Json::Value &answer) {
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    SyslogFailureClear();
    LogSearchCondListGen(request["host"].asString(), "", "", "", request["keyword"].asString(), "", "",
                         conditions);
    if (SyslogFailureGet()->kind != KELO_FAILURE_NONE)
        throw Failure(); // the keyword has a broken regular expression
    const SyslogDBSnapshot snapshot(reader);
    Check(snapshot.IsTaken() ? 0 : -1);
    answer["total"] = Check(reader.SelectCount(conditions, nullptr, nullptr));
    answer["logs"] = Json::arrayValue;
    ForEachLog(reader, conditions, {kPageRows, request["offset"].asUInt64()}, {0, SYSLOG_ATTRI_ID},
               [&](const _SYSLOG_LOG_DATA_tag &log) {
                   Json::Value &row = answer["logs"].append(Json::objectValue);
                   row["id"] = static_cast<Json::UInt64>(log.id);
                   row["host"] = log.host;
                   row["msg"] = log.msg;
               });
}

void Serve(const std::string &path, Requests &requests) {
    SyslogDBReader reader(path); // used by this thread alone
    Json::StreamWriterBuilder format;
    format["indentation"] = "";
    for (Json::Value request; requests.Take(request);) {
        Json::Value answer;
        answer["id"] = request["id"];
        answer["status"] = 200;
        try {
            Search(reader, request, answer);
        } catch (const Failure &failure) {
            answer["status"] = StatusOf(failure.kind);
            answer["reason"] = failure.what();
        } catch (const Json::Exception &error) { // a member of another type
            answer["status"] = 400;
            answer["reason"] = error.what();
        }
        static std::mutex output;
        const std::lock_guard guard(output);
        std::cout << Json::writeString(format, answer) << std::endl;
    }
}

} // namespace

int main(int argc, char **argv) {
    if (argc != 2 && argc != 3)
        return 2;
    Requests requests;
    std::vector<std::thread> threads;
    for (int left = argc == 3 ? std::atoi(argv[2]) : 20; left > 0; --left)
        threads.emplace_back(Serve, argv[1], std::ref(requests));
    for (std::string line; std::getline(std::cin, line);) {
        std::vector<Json::Value> commands;
        CmdParser().CmdParse(line, commands); // reports in the system log what is no JSON
        for (Json::Value &command : commands)
            if (command.isObject())
                requests.Put(std::move(command));
    }
    requests.End();
    for (std::thread &thread : threads)
        thread.join();
}
