#include "cluster/configuration.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <optional>

#include "cluster/cluster_error.h"
#include "common/unique_fd.h"
#include "keloplatform/failure_kind.h"

namespace kelo::platform {
namespace {

constexpr size_t kMaxBytes = 64 << 10;
constexpr long kMaxTimeoutSec = 86400;

[[noreturn]] void FailWithError(int error) {
    throw ClusterError(KELOFailureKindOfErrno(error), std::strerror(error));
}

// The password is in it.
void CheckMode(int file) {
    struct stat status {};
    if (fstat(file, &status) != 0)
        FailWithError(errno);
    if (!S_ISREG(status.st_mode))
        throw ClusterError(KELO_FAILURE_ARGUMENT, "it is no regular file");
    if ((status.st_mode & (S_IWGRP | S_IRWXO)) != 0)
        throw ClusterError(KELO_FAILURE_PERMISSION,
                           "its mode lets others read the password, or the group change it; use chmod 0640");
}

std::string ReadText(const std::string &path) {
    const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (file.Get() < 0)
        FailWithError(errno);
    CheckMode(file.Get());
    std::string text(kMaxBytes + 1, '\0');
    size_t size = 0;
    ssize_t count = 0;
    while (size < text.size() && (count = read(file.Get(), text.data() + size, text.size() - size)) > 0)
        size += static_cast<size_t>(count);
    if (count < 0)
        FailWithError(errno);
    if (size > kMaxBytes)
        throw ClusterError(KELO_FAILURE_FORMAT, "it is longer than 64 KiB");
    text.resize(size);
    return text;
}

std::string_view Trimmed(std::string_view text) {
    constexpr std::string_view kBlanks = " \t\r";
    const size_t first = text.find_first_not_of(kBlanks);
    if (first == std::string_view::npos)
        return {};
    return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

bool IsNameByte(char byte) {
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') ||
           byte == '_';
}

// "" if it is well-formed, else what is wrong.
std::string ProblemOfUrl(std::string_view url) {
    const size_t scheme = url.find("://");
    const std::string_view kind = url.substr(0, std::min(scheme, url.size()));
    if (scheme == std::string_view::npos || (kind != "http" && kind != "https"))
        return "the URL of a server begins with http:// or https://";
    const std::string_view server = url.substr(scheme + 3);
    if (server.empty())
        return "the URL has no server";
    if (server.find_first_of("@?#/ \t\"'\\") != std::string_view::npos)
        return "the URL has more than a server and its port; user and password have lines of their own";
    return "";
}

std::optional<long> SecondsOf(std::string_view text) {
    long seconds = 0;
    const auto [end, error] = std::from_chars(text.begin(), text.end(), seconds);
    if (error != std::errc() || end != text.end() || seconds < 1 || seconds > kMaxTimeoutSec)
        return std::nullopt;
    return seconds;
}

class DescriptionReader {
public:
    explicit DescriptionReader(ClusterConfiguration &configuration) : configuration_(configuration) {}

    void Take(std::string_view text) {
        while (!text.empty()) {
            const std::string_view line = text.substr(0, text.find('\n'));
            text.remove_prefix(std::min(line.size() + 1, text.size()));
            ++number_;
            TakeLine(line);
        }
        if (configuration_.urls.empty())
            throw ClusterError(KELO_FAILURE_FORMAT, "no line 'url=' names a server");
        if (configuration_.user.empty())
            throw ClusterError(KELO_FAILURE_FORMAT, "no line 'user=' names the user");
    }

private:
    [[noreturn]] void Refuse(const std::string &text) const {
        throw ClusterError(KELO_FAILURE_FORMAT, "line " + std::to_string(number_) + ": " + text);
    }

    void TakeLine(std::string_view line) {
        if (line.find('\0') != std::string_view::npos)
            Refuse("a NUL byte");
        line = Trimmed(line);
        if (number_ == 1 && line != kClusterHeading)
            Refuse("the first line is not [cluster]");
        if (number_ == 1 || line.empty() || line[0] == '#')
            return;
        const size_t equals = line.find('=');
        if (equals == std::string_view::npos)
            Refuse("'" + std::string(line) + "' has no '='");
        const std::string key(Trimmed(line.substr(0, equals)));
        const std::string value(Trimmed(line.substr(equals + 1)));
        if (key != "password" && value.empty())
            Refuse("'" + key + "=' has no value");
        if (key != "url" && std::find(keys_.begin(), keys_.end(), key) != keys_.end())
            Refuse("'" + key + "=' is there already");
        TakeValue(key, value);
        keys_.push_back(key);
    }

    void TakeValue(const std::string &key, const std::string &value) {
        if (key == "url")
            TakeUrl(value);
        else if (key == "user")
            configuration_.user = value;
        else if (key == "password")
            configuration_.password = value;
        else if (key == "partial-user")
            configuration_.partialUser = value;
        else if (key == "database")
            TakeDatabase(value);
        else if (key == "ca")
            TakeCaFile(value);
        else if (key == "timeout")
            TakeTimeout(value);
        else
            Refuse("unknown key '" + key +
                   "'; keys are url, user, password, partial-user, database, ca, timeout");
    }

    void TakeUrl(std::string url) {
        while (url.ends_with('/') && !url.ends_with("//"))
            url.pop_back();
        const std::string problem = ProblemOfUrl(url);
        if (!problem.empty())
            Refuse("'" + url + "': " + problem);
        std::vector<std::string> &urls = configuration_.urls;
        if (std::find(urls.begin(), urls.end(), url) != urls.end())
            Refuse("'" + url + "' is there already");
        urls.push_back(url);
    }

    void TakeDatabase(const std::string &name) {
        if (!std::all_of(name.begin(), name.end(), IsNameByte) || (name[0] >= '0' && name[0] <= '9'))
            Refuse("'" + name + "': the name of a database has letters, digits and '_' only");
        configuration_.database = name;
    }

    void TakeCaFile(const std::string &path) {
        if (path[0] != '/')
            Refuse("'" + path + "': the file of certificates needs an absolute path");
        configuration_.caFile = path;
    }

    void TakeTimeout(const std::string &value) {
        const std::optional<long> seconds = SecondsOf(value);
        if (!seconds)
            Refuse("'" + value + "': the timeout is a number of seconds from 1 to " +
                   std::to_string(kMaxTimeoutSec));
        configuration_.timeoutSec = *seconds;
    }

    ClusterConfiguration &configuration_;
    size_t number_ = 0; // of the line
    std::vector<std::string> keys_;
};

} // namespace

ClusterConfiguration ReadClusterConfiguration(const std::string &path) {
    ClusterConfiguration configuration;
    configuration.path = path;
    DescriptionReader(configuration).Take(ReadText(path));
    return configuration;
}

} // namespace kelo::platform
