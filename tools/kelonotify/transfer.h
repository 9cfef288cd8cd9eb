#pragma once

#include <curl/curl.h>

#include <memory>
#include <string>

#include "kelonotify/channel.h"

namespace kelo::tool {

struct SlistFreer {
    void operator()(curl_slist *list) const { curl_slist_free_all(list); }
};
using Slist = std::unique_ptr<curl_slist, SlistFreer>;

// Appends a copy of `text`. Throws std::bad_alloc.
void Append(Slist &list, const std::string &text);

// A libcurl handle for many transfers, which keeps its connections between them. No redirects, no protocols
// but those of the caller, no output; every step is limited by the time-out. Of an answer 64 KiB are read:
// with longer headers the transfer fails, and of a longer text the rest is left.
class Transfer {
public:
    // `protocols` in the form of CURLOPT_PROTOCOLS_STR. Throws std::bad_alloc.
    Transfer(const ChannelOptions &options, const char *protocols);
    Transfer(const Transfer &) = delete;
    Transfer &operator=(const Transfer &) = delete;

    template <typename Value>
    void Set(CURLoption option, Value value) {
        Check(curl_easy_setopt(handle_.get(), option, value));
    }

    // For a CURLOPT_HEADERFUNCTION of the caller's: what it has to return.
    size_t CountHeader(size_t bytes);

    // Runs the transfer. `Code` is then the last response code, 0 for none.
    CURLcode Run();
    long Code() const;
    // The error, on one line.
    std::string Reason(CURLcode code) const;

private:
    struct Closer {
        void operator()(CURL *handle) const { curl_easy_cleanup(handle); }
    };
    static void Check(CURLcode code);
    static size_t DropAnswer(char *data, size_t size, size_t count, void *transfer);
    static size_t DropHeader(char *data, size_t size, size_t count, void *transfer);

    std::unique_ptr<CURL, Closer> handle_;
    std::string caFile_;
    char error_[CURL_ERROR_SIZE] = {};
    size_t answerBytes_ = 0;
    bool isHeaderTooLong_ = false;
};

} // namespace kelo::tool
