// The mail channel: SMTP, one transaction for each recipient.

#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <stdexcept>

#include "kelonotify/channel.h"
#include "kelonotify/mime.h"
#include "kelonotify/safe_text.h"
#include "kelonotify/transfer.h"
#include "keloplatform/kelonotify.h"

namespace kelo::tool {
namespace {

constexpr size_t kMaxSubjectBytes = 320;
constexpr size_t kMaxReplyBytes = 250;
constexpr size_t kMaxMailBytes = size_t{256} << 10;

bool IsAddress(const std::string &text) {
    const auto isAllowed = [](char byte) {
        return byte > 0x20 && byte < 0x7f && std::strchr("<>()[],;:\\\"", byte) == nullptr;
    };
    const size_t at = text.find('@');
    return at != 0 && at != std::string::npos && at + 1 < text.size() && text.size() <= 254 &&
           std::all_of(text.begin(), text.end(), isAllowed);
}

bool IsHost(const std::string &text) {
    return !text.empty() && text.find_first_not_of("abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ"
                                                   "0123456789.-_:") == std::string::npos;
}

std::string HostName() {
    char name[256] = {};
    gethostname(name, sizeof name - 1);
    return IsEntryId(name) ? name : "localhost";
}

class MailChannel final : public Channel {
public:
    explicit MailChannel(const ChannelOptions &options)
        : recipients_(options.settings.GetList("smtp_to")), transfer_(options, "smtp,smtps") {
        if (KELOMailGet(&mail_) < 0)
            problem_ = "the mail settings in " + options.settings.Path() + " cannot be used";
        else
            problem_ = SetUp();
    }

    std::vector<std::string> Targets() const override {
        std::vector<std::string> targets;
        for (const std::string &recipient : recipients_)
            targets.push_back("mail:" + recipient);
        return targets.empty() ? std::vector<std::string>{"mail"} : targets;
    }

    Result Send(const Entry &entry, const std::string &target) override {
        if (!problem_.empty())
            return {Outcome::Unreachable, problem_};
        const std::string recipient = target.substr(target.find(':') + 1);
        if (!IsAddress(recipient))
            return {Outcome::Refused, "smtp_to: '" + SafeLine(recipient, 100) + "' is no address"};
        text_ = WriteMime(MakeMail(entry, recipient));
        read_ = 0;
        reply_.clear();
        isReplyComplete_ = true;
        Slist recipients;
        Append(recipients, "<" + recipient + ">");
        transfer_.Set(CURLOPT_MAIL_RCPT, recipients.get());
        transfer_.Set(CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(text_.size()));
        const CURLcode code = transfer_.Run();
        transfer_.Set(CURLOPT_MAIL_RCPT, static_cast<curl_slist *>(nullptr));
        return ResultOf(code);
    }

private:
    // Returns the error in the settings.
    std::string SetUp() {
        const std::string security = mail_.security;
        const std::string server = mail_.server;
        if (!security.empty() && security != "none" && security != "starttls" && security != "tls")
            return "smtp_security is neither none nor starttls nor tls";
        if (!IsHost(server))
            return "smtp_server is no host name or address";
        if (!IsAddress(mail_.sender))
            return "smtp_from is no address";
        const bool isTls = security == "tls";
        const int port = mail_.port != 0 ? mail_.port : isTls ? 465 : security == "starttls" ? 587 : 25;
        const std::string host = server.find(':') != std::string::npos ? "[" + server + "]" : server;
        const std::string url =
            (isTls ? "smtps://" : "smtp://") + host + ":" + std::to_string(port) + "/" + HostName();
        transfer_.Set(CURLOPT_URL, url.c_str());
        transfer_.Set(CURLOPT_USE_SSL,
                      static_cast<long>(security == "starttls" ? CURLUSESSL_ALL : CURLUSESSL_NONE));
        transfer_.Set(CURLOPT_MAIL_FROM, ("<" + std::string(mail_.sender) + ">").c_str());
        if (mail_.user[0] != '\0') {
            transfer_.Set(CURLOPT_USERNAME, mail_.user);
            transfer_.Set(CURLOPT_PASSWORD, mail_.password);
        }
        transfer_.Set(CURLOPT_UPLOAD, 1L);
        transfer_.Set(CURLOPT_HEADERFUNCTION, &MailChannel::ReadReply);
        transfer_.Set(CURLOPT_HEADERDATA, this);
        transfer_.Set(CURLOPT_READFUNCTION, &MailChannel::ReadText);
        transfer_.Set(CURLOPT_READDATA, this);
        return "";
    }

    Mail MakeMail(const Entry &entry, const std::string &recipient) const {
        const std::string sender = mail_.sender;
        const std::string prefix = mail_.subjectPrefix;
        Mail mail;
        mail.sender = sender;
        mail.recipient = recipient;
        mail.subject = SafeLine(prefix + (prefix.empty() ? "" : " ") + entry.title, kMaxSubjectBytes);
        mail.body = SafeLines(entry.body, kMaxMailBytes);
        mail.messageId = entry.id + "." + HostName() + sender.substr(sender.rfind('@'));
        mail.time = entry.time;
        return mail;
    }

    // An answer to this mail concerns the mail or its recipient; any other failure concerns the server.
    Result ResultOf(CURLcode code) const {
        if (code == CURLE_OK)
            return {};
        const long answer = transfer_.Code();
        const bool isAnswer = code == CURLE_SEND_ERROR || code == CURLE_WEIRD_SERVER_REPLY;
        const bool isRefusal = isAnswer && answer >= 400 && answer < 600 && answer != 421;
        // The server's own words are more precise than libcurl's.
        const bool isReply = reply_.starts_with(std::to_string(answer));
        return {isRefusal ? Outcome::Refused : Outcome::Unreachable,
                isReply ? SafeLine(reply_, kMaxReplyBytes) : transfer_.Reason(code)};
    }

    // Called by libcurl with each line of a reply (RFC 5321, section 4.2): "550-first", "550 last".
    static size_t ReadReply(char *buffer, size_t size, size_t count, void *channel) {
        auto *self = static_cast<MailChannel *>(channel);
        std::string_view line(buffer, size * count);
        line = line.substr(0, line.find_last_not_of("\r\n") + 1);
        const bool isFailure = line.starts_with('4') || line.starts_with('5');
        const bool isFirst = self->isReplyComplete_;
        self->isReplyComplete_ = line.size() < 4 || line[3] != '-';
        if (isFailure && isFirst)
            self->reply_.clear();
        if (isFailure && self->reply_.size() < kMaxReplyBytes)
            self->reply_ += isFirst ? line : line.substr(std::min<size_t>(line.size(), 3));
        return self->transfer_.CountHeader(size * count);
    }

    static size_t ReadText(char *buffer, size_t size, size_t count, void *channel) {
        auto *self = static_cast<MailChannel *>(channel);
        const size_t length = std::min(size * count, self->text_.size() - self->read_);
        self->text_.copy(buffer, length, self->read_);
        self->read_ += length;
        return length;
    }

    KELOMAIL mail_{};
    std::vector<std::string> recipients_;
    Transfer transfer_;
    std::string problem_;
    std::string text_;
    size_t read_ = 0;
    std::string reply_; // the server's last one that was a failure, on one line
    bool isReplyComplete_ = true;
};

} // namespace

std::unique_ptr<Channel> MakeMailChannel(const ChannelOptions &options) {
    return std::make_unique<MailChannel>(options);
}

} // namespace kelo::tool
