// The SMS and push channels: HTTP requests that the settings describe.

#include <algorithm>

#include "kelonotify/channel.h"
#include "kelonotify/request_template.h"
#include "kelonotify/safe_text.h"
#include "kelonotify/transfer.h"

namespace kelo::tool {
namespace {

constexpr size_t kMaxTitleBytes = 250;
constexpr size_t kMaxPostedBytes = 4096;

bool IsLine(const std::string &text) {
    return std::none_of(text.begin(), text.end(),
                        [](char byte) { return static_cast<unsigned char>(byte) < 0x20 || byte == 0x7f; });
}

bool IsNumber(const std::string &text) {
    return text.size() <= 50 && text.find_first_not_of("0123456789+-()./*#") == std::string::npos;
}

std::string NumberOf(const std::string &target) {
    return target.substr(target.find(':') + 1);
}

// The answers that reject the request itself. The others of 400 to 499 concern access, load or time, which
// apply to the next request too.
bool IsRefusal(long code) {
    return code == 400 || code == 406 || code == 409 || code == 410 || code == 413 || code == 415 ||
           code == 422;
}

class HttpChannel final : public Channel {
public:
    HttpChannel(const ChannelOptions &options, std::string name)
        : name_(std::move(name)), problem_(ChannelProblem(options.settings, name_)),
          transfer_(options, "http,https") {
        const std::string prefix = Settings::Prefix(name_);
        url_ = options.settings.Get(prefix + "url");
        body_ = options.settings.Get(prefix + "body");
        contentType_ = options.settings.Get(prefix + "content_type");
        if (contentType_.empty())
            contentType_ = IsSms() ? "application/x-www-form-urlencoded" : "application/json";
        if (IsSms())
            numbers_ = options.settings.GetList("sms_to");
        AddHeader(prefix + "content_type", "Content-Type: " + contentType_);
        AddHeader("Expect", "Expect:"); // no wait for a "100 Continue"
        for (char digit = '1'; digit <= '9'; ++digit) {
            const std::string key = prefix + "header_" + digit;
            if (const std::string header = options.settings.Get(key); !header.empty())
                AddHeader(key, header);
        }
        transfer_.Set(CURLOPT_HTTPHEADER, headers_.get());
        transfer_.Set(CURLOPT_USERAGENT, "kelonotify");
    }

    std::vector<std::string> Targets() const override {
        std::vector<std::string> targets;
        for (const std::string &number : numbers_)
            targets.push_back(name_ + ":" + number);
        return targets.empty() ? std::vector<std::string>{name_} : targets;
    }

    Result Send(const Entry &entry, const std::string &target) override {
        const std::optional<Encoding> encoding = EncodingOf(contentType_);
        if (problem_.empty() && !encoding)
            problem_ = "no encoding of values is known for the content type '" + contentType_ + "'";
        if (!problem_.empty())
            return {Outcome::Unreachable, problem_};
        if (IsSms() && !IsNumber(NumberOf(target)))
            return {Outcome::Refused, "sms_to: '" + SafeLine(NumberOf(target), 100) + "' is no phone number"};
        const TemplateWords words = WordsOf(entry, target);
        const std::string url = FillRequest(url_, words, Encoding::Url);
        const std::string body = FillRequest(body_, words, *encoding);
        transfer_.Set(CURLOPT_URL, url.c_str());
        transfer_.Set(CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size()));
        transfer_.Set(CURLOPT_COPYPOSTFIELDS, body.c_str());
        const CURLcode code = transfer_.Run();
        if (code != CURLE_OK)
            return {Outcome::Unreachable, transfer_.Reason(code)};
        const long answer = transfer_.Code();
        if (answer >= 200 && answer < 300)
            return {};
        return {IsRefusal(answer) ? Outcome::Refused : Outcome::Unreachable,
                "the provider answers " + std::to_string(answer)};
    }

private:
    bool IsSms() const { return name_ == "sms"; }

    void AddHeader(const std::string &key, const std::string &header) {
        if (!IsLine(header))
            problem_ = key + " holds control characters";
        else
            Append(headers_, header);
    }

    TemplateWords WordsOf(const Entry &entry, const std::string &target) const {
        TemplateWords words = {{"%TITLE%", SafeLine(entry.title, kMaxTitleBytes)},
                               {"%BODY%", SafeLines(entry.body, kMaxPostedBytes)},
                               {"%TAG%", SafeLine(entry.tag, kMaxTitleBytes)},
                               {"%ID%", entry.id},
                               {"%TIME%", std::to_string(entry.time)}};
        if (IsSms())
            words.emplace_back("%NUMBER%", NumberOf(target));
        return words;
    }

    std::string name_;
    std::string problem_;
    std::string url_;
    std::string body_;
    std::string contentType_;
    std::vector<std::string> numbers_;
    Slist headers_;
    Transfer transfer_;
};

} // namespace

std::unique_ptr<Channel> MakeHttpChannel(const ChannelOptions &options, const std::string &name) {
    return std::make_unique<HttpChannel>(options, name);
}

} // namespace kelo::tool
