// Arguments arrive as bytes: well-formed UTF-8 becomes the exact UTF-16, and each maximal subpart of
// an ill-formed sequence becomes one U+FFFD (the replacement Python's decoder and the Unicode
// Standard agree on).
#include <gtest/gtest.h>

#include <string>

#include "core/core.h"

TEST(Utf8ToUtf16, WellFormedExactIllFormedByMaximalSubpart) {
    const struct {
        const char* bytes;
        std::u16string units;
    } cases[] = {
        {"a\xc3\xa9\xd0\x98\xe6\x96\x87", u"a\u00e9\u0418\u6587"},
        {"\xf0\x9f\x98\x80\xf4\x8f\xbf\xbf", u"\U0001F600\U0010FFFF"},
        {"\xc0\xaf", u"\ufffd\ufffd"},                  // overlong
        {"\xed\xa0\x80", u"\ufffd\ufffd\ufffd"},        // an encoded surrogate
        {"\xf4\x90\x80\x80", u"\ufffd\ufffd\ufffd\ufffd"},  // above U+10FFFF
        {"a\xe2\x82", u"a\ufffd"},                      // cut short: one subpart
        {"\xe2\x82x\x80\xff", u"\ufffdx\ufffd\ufffd"},
        {"\xf0\x9f\x98", u"\ufffd"},
    };
    for (const auto& c : cases) {
        char16_t out[64];
        int units = ToWide(c.bytes, -1, out, 64);
        ASSERT_GT(units, 0) << c.bytes;
        EXPECT_EQ(std::u16string(out, static_cast<size_t>(units) - 1), c.units) << c.bytes;
        EXPECT_EQ(WideSize(c.bytes), units);
    }
}
