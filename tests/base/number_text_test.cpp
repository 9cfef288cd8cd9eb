// The numbers of columns that hold any text.

#include "base/number_text.h"

#include <gtest/gtest.h>

namespace kelo::test {
namespace {

TEST(NumberText, IsInTheRangeWhateverTheTextHolds) {
    const std::tuple<const char *, int64_t, uint64_t> cases[] = {
        {"12", 12, 12},
        {" 7 apples", 7, 7},
        {"apples", 0, 0},
        {"-3", -3, 0},
        {"18446744073709551615", INT64_MAX, UINT64_MAX},
        {"99999999999999999999", INT64_MAX, UINT64_MAX},
        {"-99999999999999999999", INT64_MIN, 0},
    };
    for (const auto &[text, asSigned, asUnsigned] : cases) {
        EXPECT_EQ(tool::SignedNumber(text), asSigned) << text;
        EXPECT_EQ(tool::UnsignedNumber(text), asUnsigned) << text;
    }
}

} // namespace
} // namespace kelo::test
