#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

namespace kelo::platform {

// The skip index knows a text by its grams: every run of four ASCII bytes, with capital letters folded, is
// two of kGramBits bits.
inline constexpr size_t kGramBytes = 4;
inline constexpr size_t kGramBits = 4096;
using GramBits = std::array<uint64_t, kGramBits / 64>;

// The same with a byte for each bit, 0 or 1: faster to set.
using GramFlags = std::array<uint8_t, kGramBits>;
void AddFlags(const GramFlags &flags, GramBits &bits);

// Sets the bits of all grams of the text of a row. A text that SQLite or RE2 may find by other bytes than its
// own sets every bit: one that is not UTF-8, or has a letter outside ASCII which RE2 folds to an ASCII
// letter.
void AddGrams(std::string_view text, GramFlags &flags);

// The bits of a value of another column. A row with it has all of them.
enum class TokenColumn : uint8_t { kSeverity, kFacility };
inline constexpr size_t kBitsPerToken = 12;
std::array<uint16_t, kBitsPerToken> BitsOfToken(TokenColumn column, std::string_view value);

// The bits of the grams of a literal, without repetition: any text of a row that contains the literal,
// whatever its letter case, has them. At most `most`, spread over the literal.
std::vector<uint16_t> BitsOfLiteral(std::string_view literal, size_t most);

} // namespace kelo::platform
