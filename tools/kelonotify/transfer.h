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
// but those of the caller, no output; every step is limited by the time-out.
class Transfer {
public:
    // `protocols` in the form of CURLOPT_PROTOCOLS_STR. Throws std::bad_alloc.
    Transfer(const ChannelOptions &options, const char *protocols);

    template <typename Value>
    void Set(CURLoption option, Value value) {
        Check(curl_easy_setopt(handle_.get(), option, value));
    }

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

    std::unique_ptr<CURL, Closer> handle_;
    std::string caFile_;
    char error_[CURL_ERROR_SIZE] = {};
};

} // namespace kelo::tool
