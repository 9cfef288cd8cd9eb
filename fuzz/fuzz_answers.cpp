// Whatever a web server or a mail server answers, a notification is sent or refused with a reason on one
// line.

#include <arpa/inet.h>
#include <curl/curl.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>

#include <thread>

#include "folder.h"
#include "kelonotify/channel.h"
#include "keloplatform/root.h"

using namespace kelo::tool;

namespace {

// Answers one connection after the other with the same bytes, and closes it when the other side has read
// them.
class Server {
public:
    Server() : socket_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        address_.sin_family = AF_INET;
        address_.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address_;
        auto *address = reinterpret_cast<sockaddr *>(&address_);
        if (bind(socket_, address, size) != 0 || listen(socket_, 8) != 0 ||
            getsockname(socket_, address, &size) != 0)
            Fail("no server", "");
    }
    std::string Port() const { return std::to_string(ntohs(address_.sin_port)); }
    std::thread Serve(const std::string &answer) const {
        return std::thread([this, answer] {
            const int file = accept4(socket_, nullptr, nullptr, SOCK_CLOEXEC);
            send(file, answer.data(), answer.size(), MSG_NOSIGNAL);
            shutdown(file, SHUT_WR);
            char bytes[4096];
            while (read(file, bytes, sizeof bytes) > 0) {
            }
            close(file);
        });
    }

private:
    int socket_;
    sockaddr_in address_{};
};

void Send(Channel &channel, const std::string &target) {
    const Entry entry{
        .id = "1", .time = 1, .tag = "T", .className = "", .channels = {}, .title = "t", .body = "b\n"};
    const Result result = channel.Send(entry, target);
    if (result.reason.find_first_of("\n\r\x1b") != std::string::npos || result.reason.size() > 400)
        Fail("not one line", result.reason);
    if (result.outcome != Outcome::Sent && result.reason.empty())
        Fail("no reason", "");
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const Server server;
    static const std::string root = [] {
        curl_global_init(CURL_GLOBAL_DEFAULT);
        std::filesystem::create_directories(FuzzFolder() + "/etc");
        WriteFuzzFile(FuzzFolder() + "/etc/keloinfo.conf",
                      "smtp_mail_enabled=\"yes\"\nsmtp_server=\"127.0.0.1\"\nsmtp_port=\"" + server.Port() +
                          "\"\nsmtp_from=\"a@example.org\"\nsmtp_to=\"b@example.org\"\nsms_enabled=\"yes\"\n"
                          "sms_to=\"+1\"\nsms_body=\"%TITLE%\"\nsms_url=\"http://127.0.0.1:" +
                          server.Port() + "/\"\n");
        KELORootSet(FuzzFolder().c_str());
        return FuzzFolder();
    }();
    if (size == 0)
        return 0;
    const std::string answer(reinterpret_cast<const char *>(data) + 1, size - 1);
    const Settings settings(root);
    const Spool spool(root);
    const ChannelOptions options{settings, 2, spool};
    const bool isMail = data[0] % 2 == 0;
    std::thread served = server.Serve(answer);
    {
        const std::unique_ptr<Channel> channel =
            isMail ? MakeMailChannel(options) : MakeHttpChannel(options, "sms");
        Send(*channel, isMail ? "mail:b@example.org" : "sms:+1");
    }
    served.join();
    return 0;
}
