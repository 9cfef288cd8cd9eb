#include "cluster/http_client.h"

#include <algorithm>
#include <exception>

#include "cluster/cluster_error.h"
#include "cluster/server_error.h"

namespace kelo::platform {
namespace {

constexpr long kConnectTimeoutSec = 5;
constexpr long kOk = 200;
constexpr size_t kMaxErrorBytes = 64 << 10;
// The server sends nothing before the statement has succeeded, so that an error comes as one.
constexpr char kWhole[] = "/?wait_end_of_query=1&buffer_size=1048576&database=";

} // namespace

// One request.
struct HttpClient::Transfer {
    HttpClient &client;
    const Taker &take;
    std::string error; // what a server says instead of an answer
    std::exception_ptr exception = nullptr;
};

template <typename Value>
void HttpClient::Set(CURLoption option, Value value) {
    if (curl_.setOption(handle_.get(), option, value) != CURLE_OK)
        throw ClusterError(KELO_FAILURE_OTHER, "libcurl refuses an option");
}

HttpClient::HttpClient(const ClusterConfiguration &configuration)
    : configuration_(configuration), curl_(CurlLibrary::Get()), handle_(curl_.init()),
      headers_(curl_.append(nullptr, "Expect:")) {
    if (handle_ == nullptr || headers_ == nullptr)
        throw ClusterError(KELO_FAILURE_MEMORY, "out of memory");
    Set(CURLOPT_NOSIGNAL, 1L);
    Set(CURLOPT_PROTOCOLS_STR, "http,https");
    Set(CURLOPT_FOLLOWLOCATION, 0L);
    Set(CURLOPT_PROXY, ""); // none, whatever the environment says
    Set(CURLOPT_NETRC, static_cast<long>(CURL_NETRC_IGNORED));
    Set(CURLOPT_SSL_VERIFYPEER, 1L);
    Set(CURLOPT_SSL_VERIFYHOST, 2L);
    Set(CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
    if (!configuration.caFile.empty()) {
        Set(CURLOPT_CAINFO, configuration.caFile.c_str());
        Set(CURLOPT_CAPATH, static_cast<char *>(nullptr));
    }
    Set(CURLOPT_CONNECTTIMEOUT, kConnectTimeoutSec);
    Set(CURLOPT_TIMEOUT, configuration.timeoutSec);
    Set(CURLOPT_HTTPAUTH, static_cast<long>(CURLAUTH_BASIC));
    Set(CURLOPT_PASSWORD, configuration.password.c_str());
    Set(CURLOPT_HTTPHEADER, headers_.get());
    Set(CURLOPT_ERRORBUFFER, reason_.data());
    Set(CURLOPT_WRITEFUNCTION, &HttpClient::TakeBytes);
}

size_t HttpClient::TakeBytes(char *bytes, size_t size, size_t count, void *transfer) {
    auto &request = *static_cast<Transfer *>(transfer);
    const std::string_view part(bytes, size * count);
    long status = 0;
    request.client.curl_.getInfo(request.client.handle_.get(), CURLINFO_RESPONSE_CODE, &status);
    try {
        if (status == kOk)
            request.take(part);
        else
            request.error += part.substr(0, kMaxErrorBytes - std::min(kMaxErrorBytes, request.error.size()));
        return part.size();
    } catch (...) {
        request.exception = std::current_exception();
        return 0; // which ends the transfer
    }
}

void HttpClient::RunOnce(const std::string &url, const std::string &user, std::string_view statement,
                         const Taker &take) {
    Set(CURLOPT_FRESH_CONNECT, 1L);
    Set(CURLOPT_FORBID_REUSE, 1L);
    Run(url, user, statement, take);
}

void HttpClient::Run(const std::string &url, const std::string &user, std::string_view statement,
                     const Taker &take) {
    Transfer transfer{*this, take, {}};
    Set(CURLOPT_URL, (url + kWhole + configuration_.database).c_str());
    Set(CURLOPT_USERNAME, user.c_str());
    Set(CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(statement.size()));
    Set(CURLOPT_POSTFIELDS, statement.data());
    Set(CURLOPT_WRITEDATA, &transfer);
    reason_[0] = '\0';
    const CURLcode code = curl_.perform(handle_.get());
    Set(CURLOPT_FRESH_CONNECT, 0L);
    Set(CURLOPT_FORBID_REUSE, 0L);
    long status = 0;
    curl_off_t sent = 0;
    curl_.getInfo(handle_.get(), CURLINFO_RESPONSE_CODE, &status);
    curl_.getInfo(handle_.get(), CURLINFO_SIZE_UPLOAD_T, &sent);
    hasNotSent_ = code != CURLE_OK && sent == 0 && status == 0;
    if (transfer.exception != nullptr)
        std::rethrow_exception(transfer.exception);
    if (code == CURLE_OPERATION_TIMEDOUT && sent > 0)
        throw ClusterError(KELO_FAILURE_IO, url + " gave no answer within " +
                                                std::to_string(configuration_.timeoutSec) + " seconds");
    if (code != CURLE_OK)
        throw ClusterError(KELO_FAILURE_IO,
                           url + ": " + (reason_[0] != '\0' ? reason_.data() : curl_.describe(code)));
    if (status != kOk)
        throw ErrorOfServer(url, status, transfer.error);
}

} // namespace kelo::platform
