#include "cluster/password.h"

#include <openssl/evp.h>
#include <sys/random.h>

#include <array>
#include <cerrno>
#include <cstring>

#include "base/errors.h"
#include "base/late_function.h"

namespace kelo::tool {
namespace {

constinit const LateFunction<decltype(::EVP_Digest)> digestOf("libcrypto.so.3", "EVP_Digest");
constinit const LateFunction<decltype(::EVP_sha256)> sha256("libcrypto.so.3", "EVP_sha256");

template <typename Bytes>
std::string Hex(const Bytes &bytes) {
    constexpr char kDigits[] = "0123456789abcdef";
    std::string text;
    for (const unsigned char byte : bytes)
        text.append({kDigits[byte >> 4], kDigits[byte & 15]});
    return text;
}

} // namespace

std::string MakePassword() {
    std::array<unsigned char, 20> bytes{};
    if (getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size()))
        throw OutputError(std::string("no random numbers for a password: ") + std::strerror(errno));
    return Hex(bytes);
}

std::string Sha256Hex(const std::string &text) {
    std::array<unsigned char, 32> digest{};
    unsigned int size = 0;
    if (digestOf(text.data(), text.size(), digest.data(), &size, sha256(), nullptr) != 1 ||
        size != digest.size())
        throw OutputError("SHA-256 cannot be computed");
    return Hex(digest);
}

} // namespace kelo::tool
