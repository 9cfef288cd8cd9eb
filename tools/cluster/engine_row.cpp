#include "cluster/engine_row.h"

#include <openssl/evp.h>

#include <algorithm>
#include <cstring>
#include <stdexcept>

#include "base/late_function.h"
#include "keloplatform/cluster.h"

namespace kelo::tool {
namespace {

constinit const LateFunction<decltype(::EVP_Digest)> digestOfRow("libcrypto.so.3", "EVP_Digest");
constinit const LateFunction<decltype(::EVP_md5)> md5("libcrypto.so.3", "EVP_md5");

constexpr int64_t kLastSecond = (int64_t{1} << (63 - KELODB_CLUSTER_BITS_BELOW_SECOND)) - 1;
static_assert(KELODB_CLUSTER_BITS_BELOW_SECOND == kNodeBits + kMessageBits);

// Numbers of the format have their lowest byte first, as in the memory of the machines that Debian runs the
// server on.
template <typename Number>
void AppendNumber(Number number, std::string &bytes) {
    for (size_t i = 0; i < sizeof number; ++i)
        bytes += static_cast<char>(static_cast<uint64_t>(number) >> 8 * i);
}

// A length has seven bits in each byte.
void AppendLength(uint64_t length, std::string &bytes) {
    for (; length >= 0x80; length >>= 7)
        bytes += static_cast<char>(0x80 | (length & 0x7f));
    bytes += static_cast<char>(length);
}

bool TakeNumber(std::string_view &bytes, int64_t &number) {
    if (bytes.size() < sizeof number)
        return false;
    uint64_t value = 0;
    for (size_t i = 0; i < sizeof number; ++i)
        value |= static_cast<uint64_t>(static_cast<unsigned char>(bytes[i])) << 8 * i;
    number = static_cast<int64_t>(value);
    bytes.remove_prefix(sizeof number);
    return true;
}

bool TakeText(std::string_view &bytes, std::string &text) {
    uint64_t length = 0;
    for (int shift = 0; shift < 64; shift += 7) {
        if (bytes.empty())
            return false;
        const auto byte = static_cast<unsigned char>(bytes.front());
        bytes.remove_prefix(1);
        length |= static_cast<uint64_t>(byte & 0x7f) << shift;
        if (byte < 0x80)
            break;
    }
    if (bytes.size() < length)
        return false;
    text = bytes.substr(0, length);
    bytes.remove_prefix(length);
    return true;
}

} // namespace

std::string EngineColumns() {
    std::string columns;
    for (const char *column : kEngineColumns)
        columns.append(columns.empty() ? "" : ", ").append(column);
    return columns;
}

uint64_t FirstEngineId(int64_t second) {
    return static_cast<uint64_t>(std::clamp<int64_t>(second, 0, kLastSecond))
           << KELODB_CLUSTER_BITS_BELOW_SECOND;
}

uint64_t LastEngineId(int64_t second) {
    return FirstEngineId(second) | ((uint64_t{1} << KELODB_CLUSTER_BITS_BELOW_SECOND) - 1);
}

uint64_t EngineId(const EngineRow &row, unsigned int node) {
    return FirstEngineId(row.second) | uint64_t{node} << kMessageBits | (row.source & kMessageMask);
}

uint64_t HashOf(const EngineRow &row) {
    thread_local std::string joined;
    joined.clear();
    ForEachColumn(row, [&](size_t, const std::string *text) {
        joined.append(text != nullptr ? *text : std::to_string(row.second)) += '\0';
    });
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned int size = 0;
    if (digestOfRow(joined.data(), joined.size(), digest, &size, md5(), nullptr) != 1)
        throw std::runtime_error("MD5 cannot be computed");
    uint64_t hash = 0;
    for (size_t i = 0; i < sizeof hash; ++i)
        hash = hash << 8 | digest[i];
    return hash;
}

std::string HashExpression() {
    std::string parts;
    for (size_t column = 0; column < std::size(kEngineColumns); ++column) {
        const std::string name = kEngineColumns[column];
        parts += (parts.empty() ? "" : ", ") + (column == kSecondColumn ? "toString(" + name + ")" : name) +
                 ", '\\0'";
    }
    return "halfMD5(concat(" + parts + "))";
}

void AppendRow(const EngineRow &row, std::string &bytes) {
    ForEachColumn(row, [&](size_t, const std::string *text) {
        if (text == nullptr) {
            AppendNumber(row.second, bytes);
        } else {
            AppendLength(text->size(), bytes);
            bytes += *text;
        }
    });
}

std::optional<EngineRow> TakeRow(std::string_view &bytes) {
    EngineRow row;
    bool isWhole = true;
    ForEachColumn(row, [&](size_t, std::string *text) {
        isWhole = isWhole && (text == nullptr ? TakeNumber(bytes, row.second) : TakeText(bytes, *text));
    });
    return isWhole ? std::optional(std::move(row)) : std::nullopt;
}

} // namespace kelo::tool
