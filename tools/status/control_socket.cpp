#include "status/control_socket.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include "base/files.h"

namespace kelo::tool {
namespace {

using Clock = std::chrono::steady_clock;

constexpr size_t kLargestAnswer = 64 << 20;
constexpr const char *kEnd = "\n.\n";

// Connects without waiting; returns 0 or the reason (errno).
int Connect(int file, const std::string &path) {
    const std::filesystem::path whole(path);
    const std::string folderName = whole.has_parent_path() ? whole.parent_path().string() : ".";
    const FileHandle folder(open(folderName.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!folder)
        return errno;
    // The address has room for 107 bytes only.
    const std::string name =
        "/proc/self/fd/" + std::to_string(folder.Get()) + "/" + whole.filename().string();
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (name.size() >= sizeof address.sun_path)
        return ENAMETOOLONG;
    name.copy(address.sun_path, name.size());
    const int status = connect(file, reinterpret_cast<const sockaddr *>(&address), sizeof address);
    return status == 0 ? 0 : errno;
}

// Waits until the socket is ready for `events`; false when the time is over.
bool IsReady(int file, short events, Clock::time_point deadline) {
    while (true) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now());
        if (left.count() <= 0)
            return false;
        pollfd waiting{file, events, 0};
        const int count = poll(&waiting, 1, static_cast<int>(left.count()));
        if (count > 0 || (count < 0 && errno != EINTR))
            return true; // a failure shows at the next call
    }
}

// Returns the problem, or "".
std::string Send(int file, std::string_view text, Clock::time_point deadline) {
    while (!text.empty()) {
        if (!IsReady(file, POLLOUT, deadline))
            return "it takes no command in time";
        const ssize_t sent = send(file, text.data(), text.size(), MSG_NOSIGNAL);
        if (sent > 0)
            text.remove_prefix(static_cast<size_t>(sent));
        else if (errno != EAGAIN && errno != EINTR)
            return std::strerror(errno);
    }
    return "";
}

std::string Receive(int file, std::string &text, Clock::time_point deadline) {
    char buffer[65536];
    while (!text.ends_with(kEnd)) {
        if (!IsReady(file, POLLIN, deadline))
            return "it does not answer in time";
        const ssize_t size = recv(file, buffer, sizeof buffer, 0);
        if (size > 0)
            text.append(buffer, static_cast<size_t>(size));
        else if (size == 0)
            return "its answer is not complete";
        else if (errno != EAGAIN && errno != EINTR)
            return std::strerror(errno);
        if (text.size() > kLargestAnswer)
            return "its answer is too long";
    }
    text.resize(text.size() - 2);
    return "";
}

} // namespace

ControlAnswer AskControlSocket(const std::string &path, const std::string &command,
                               std::chrono::milliseconds timeout) {
    const auto deadline = Clock::now() + timeout;
    ControlAnswer answer;
    const FileHandle file(socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
    answer.connectError = file ? Connect(file.Get(), path) : errno;
    if (answer.connectError != 0) {
        answer.problem = std::strerror(answer.connectError);
        return answer;
    }
    ucred peer{};
    socklen_t size = sizeof peer;
    if (getsockopt(file.Get(), SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0)
        answer.pid = peer.pid;
    answer.problem = Send(file.Get(), command + "\n", deadline);
    if (answer.problem.empty())
        answer.problem = Receive(file.Get(), answer.text, deadline);
    return answer;
}

} // namespace kelo::tool
