// The argument encoding: four lower-case hex digits per UTF-16 unit, and the growing buffer that
// the main call reuses for every argument.
#include <gtest/gtest.h>

#include <stdlib.h>

#include <string>

#include "jvm/jvm.h"

namespace {

std::string Encode(const std::u16string& text) {
    std::string out(4 * text.size() + 1, '\x7f');
    EncodeArgument(text.c_str(), &out[0]);
    EXPECT_EQ(out.back(), '\0');
    out.pop_back();
    return out;
}

TEST(EncodeArgument, ProductExamplesAndEveryUnitValue) {
    EXPECT_EQ(Encode(u"-noSplash"), "002d006e006f00530070006c006100730068");
    EXPECT_EQ(Encode(u"C:\\M\u00fcll"), "0043003a005c004d00fc006c006c");
    EXPECT_EQ(Encode(u"a b"), "006100200062");
    EXPECT_EQ(Encode(u"\U0001F600"), "d83dde00");  // each surrogate by itself
    std::u16string all;
    for (unsigned u = 1; u <= 0xFFFF; ++u) all.push_back(static_cast<char16_t>(u));
    std::string encoded = Encode(all);
    ASSERT_EQ(encoded.size(), 4 * all.size());
    for (size_t i = 0; i < all.size(); ++i) {
        const std::string group = encoded.substr(4 * i, 4);
        ASSERT_EQ(group.find_first_not_of("0123456789abcdef"), std::string::npos) << group;
        ASSERT_EQ(strtoul(group.c_str(), nullptr, 16), all[i]) << "unit " << i;
    }
    // An empty text leaves the output alone.
    char out[8] = "keepme";
    EncodeArgument(u"", out);
    EXPECT_STREQ(out, "keepme");
}

TEST(EncodeArgumentInto, EmptyRepeatsThePreviousTextAndLongTextsGrowTheBuffer) {
    EncodeBuffer b = {nullptr, 0};
    auto put = [&b](const std::u16string& text) {
        EXPECT_TRUE(EncodeArgumentInto(text.c_str(), &b));
        return std::string(b.text);
    };
    EXPECT_EQ(put(u""), "");  // first in place: empty
    EXPECT_EQ(put(u"ab"), "00610062");
    EXPECT_EQ(put(u""), "00610062");
    EXPECT_EQ(put(u"c"), "0063");  // no old tail after a shorter one
    std::u16string text(32767, u'\u4E2D');
    EXPECT_EQ(put(text), Encode(text));
    EXPECT_GE(b.capacity, 4 * text.size() + 1);
    EXPECT_EQ(put(u"").size(), 4 * text.size());
    free(b.text);
}

}  // namespace
