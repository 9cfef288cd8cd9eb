#include "servers.h"

#include <arpa/inet.h>
#include <curl/curl.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <stdexcept>

namespace kelo::test {
namespace {

// Ports that are free now; all of them at once, so that they differ.
std::vector<int> FreePorts(size_t count) {
    std::vector<int> sockets;
    std::vector<int> ports;
    for (size_t i = 0; i < count; ++i) {
        const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockets.push_back(socket);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        if (bind(socket, reinterpret_cast<sockaddr *>(&address), size) != 0 ||
            getsockname(socket, reinterpret_cast<sockaddr *>(&address), &size) != 0)
            throw std::runtime_error("no free port");
        ports.push_back(ntohs(address.sin_port));
    }
    for (const int socket : sockets)
        close(socket);
    return ports;
}

size_t Append(char *bytes, size_t size, size_t count, void *text) {
    static_cast<std::string *>(text)->append(bytes, size * count);
    return size * count;
}

void Replace(std::string &text, const std::string &from, const std::string &to) {
    for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size()))
        text.replace(at, from.size(), to);
}

// What the package of the server brings along.
constexpr char kUsers[] =
    "<yandex><profiles><default><max_threads>2</max_threads></default></profiles><users><default><password>p"
    "</password><networks><ip>127.0.0.0/8</ip></networks><profile>default</profile><quota>default</quota>"
    "</default></users><quotas><default></default></quotas></yandex>\n";

// Not 127.0.0.1, which every server would take for its own.
std::string AddressOf(size_t server) {
    return "127.0.0." + std::to_string(server + 2);
}

} // namespace

Servers *sharedServers = nullptr;

bool Servers::AreInstalled() {
    return RunIn("/", "command -v clickhouse-server >/dev/null").status == 0;
}

Servers::Servers() : ports_(FreePorts(3)) {
    const ProgramResult made =
        RunIn(root_.Path(), "exec kelosyslog cluster init new --shard 127.0.0.2 --shard 127.0.0.3 "
                            "--network 127.0.0.1 --http-port " +
                                std::to_string(ports_[0]) + " --native-port " + std::to_string(ports_[1]));
    if (made.status != 0)
        throw std::runtime_error("cluster init: " + made.err);
    for (size_t server = 0; server < kServers; ++server) {
        WriteConfiguration(server);
        Start(server);
    }
    const std::string tables = ReadFile(Made("tables.sql"));
    for (size_t server = 0; server < kServers; ++server) {
        for (size_t start = 0, end; (end = tables.find(";\n", start)) != std::string::npos; start = end + 2)
            Run(server, tables.substr(start, end - start));
    }
}

std::string Servers::Url(size_t server) const {
    return "http://" + AddressOf(server) + ":" + std::to_string(ports_[0]);
}

std::string Servers::NativeAddress(size_t server) const {
    return AddressOf(server) + ":" + std::to_string(ports_[1]);
}

void Servers::WriteConfiguration(size_t server) const {
    const std::string folder = Made(AddressOf(server));
    std::string text =
        "<yandex><logger><level>warning</level><log>DIR/log</log><errorlog>DIR/errors</errorlog></logger>"
        "<listen_host>" +
        AddressOf(server) + "</listen_host><http_port>" + std::to_string(ports_[0]) +
        "</http_port><tcp_port>" + std::to_string(ports_[1]) + "</tcp_port><interserver_http_port>" +
        std::to_string(ports_[2]) +
        "</interserver_http_port><path>DIR/data/</path><tmp_path>DIR/tmp/</tmp_path>"
        "<user_files_path>DIR/files/</user_files_path><format_schema_path>DIR/formats/"
        "</format_schema_path><users_config>DIR/users.xml</users_config><default_profile>default"
        "</default_profile><default_database>default</default_database><timezone>UTC</timezone>"
        "<mark_cache_size>67108864</mark_cache_size></yandex>\n";
    Replace(text, "DIR", folder);
    WriteFile(folder + "/config.xml", text);
    WriteFile(folder + "/users.xml", kUsers);
}

void Servers::Start(size_t server) {
    const std::string folder = Made(AddressOf(server));
    programs_[server] =
        std::make_unique<ChildProgram>(folder, "exec clickhouse-server --config-file=config.xml >/dev/null");
    const bool isReady = programs_[server]->Await([&] {
        try {
            return Run(server, "SELECT 1") == "1\n";
        } catch (const std::runtime_error &) {
            return false;
        }
    });
    if (!isReady)
        throw std::runtime_error("clickhouse-server did not start: " + programs_[server]->Err());
}

std::string Servers::Run(size_t server, const std::string &sql) const {
    const std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> curl(curl_easy_init(), curl_easy_cleanup);
    std::string answer;
    long status = 0;
    curl_easy_setopt(curl.get(), CURLOPT_URL, Url(server).c_str());
    curl_easy_setopt(curl.get(), CURLOPT_PROXY, "");
    curl_easy_setopt(curl.get(), CURLOPT_USERPWD, "default:p");
    curl_easy_setopt(curl.get(), CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(sql.size()));
    curl_easy_setopt(curl.get(), CURLOPT_POSTFIELDS, sql.c_str());
    curl_easy_setopt(curl.get(), CURLOPT_WRITEFUNCTION, Append);
    curl_easy_setopt(curl.get(), CURLOPT_WRITEDATA, &answer);
    const CURLcode code = curl_easy_perform(curl.get());
    curl_easy_getinfo(curl.get(), CURLINFO_RESPONSE_CODE, &status);
    if (code != CURLE_OK || status != 200)
        throw std::runtime_error(sql.substr(0, 200) + ": " + curl_easy_strerror(code) + " " + answer);
    return answer;
}

} // namespace kelo::test
