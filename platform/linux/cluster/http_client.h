#pragma once

#include <array>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "cluster/configuration.h"
#include "cluster/curl_library.h"

namespace kelo::platform {

// Sends statements to the servers of a cluster. A connection stays open for the next statement.
class HttpClient {
public:
    // Throws ClusterError. The configuration must outlive the client.
    explicit HttpClient(const ClusterConfiguration &configuration);

    // Takes a part of an answer; it may throw.
    using Taker = std::function<void(std::string_view)>;

    // Runs a statement on the server at `url` as `user` and hands its answer over, part by part. Throws
    // ClusterError, also when the answer breaks off: what was taken until then is no answer.
    void Run(const std::string &url, const std::string &user, std::string_view statement, const Taker &take);

    // The same on a connection of its own: on an open one that breaks, libcurl sends a statement again.
    void RunOnce(const std::string &url, const std::string &user, std::string_view statement,
                 const Taker &take);

    // Whether the last Run failed before the server had the statement.
    bool HasNotSent() const { return hasNotSent_; }

private:
    struct Cleanup {
        void operator()(CURL *handle) const { CurlLibrary::Get().cleanup(handle); }
    };
    struct FreeList {
        void operator()(curl_slist *list) const { CurlLibrary::Get().freeAll(list); }
    };
    struct Transfer;
    static size_t TakeBytes(char *bytes, size_t size, size_t count, void *transfer);
    template <typename Value>
    void Set(CURLoption option, Value value);

    const ClusterConfiguration &configuration_;
    const CurlLibrary &curl_;
    std::unique_ptr<CURL, Cleanup> handle_;
    std::unique_ptr<curl_slist, FreeList> headers_;
    std::array<char, CURL_ERROR_SIZE> reason_{};
    bool hasNotSent_ = false;
};

} // namespace kelo::platform
