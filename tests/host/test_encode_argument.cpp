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

struct OwnedBuffer {
    EncodeBuffer buffer = {nullptr, 0};
    ~OwnedBuffer() { free(buffer.text); }
    std::string Put(const std::u16string& text) {
        EXPECT_TRUE(EncodeArgumentInto(text.c_str(), &buffer));
        return buffer.text;
    }
};

TEST(EncodeArgument, ProductExamples) {
    EXPECT_EQ(Encode(u"-noSplash"), "002d006e006f00530070006c006100730068");
    EXPECT_EQ(Encode(u"C:\\M\u00fcll"), "0043003a005c004d00fc006c006c");
    EXPECT_EQ(Encode(u"a b"), "006100200062");
    EXPECT_EQ(Encode(u"\U0001F600"), "d83dde00");  // each surrogate by itself
}

TEST(EncodeArgument, DigitsAreLowerCaseWhateverTheInput) {
    EXPECT_EQ(Encode(u"ABCDEF"), "004100420043004400450046");
    EXPECT_EQ(Encode(u"\uABCD\uFFFF\u00FF"), "abcdffff00ff");
    // A lone surrogate is a unit like any other.
    EXPECT_EQ(Encode(u"\xDC00x"), "dc000078");
}

TEST(EncodeArgument, EveryUnitValueRoundTrips) {
    std::u16string all;
    for (unsigned u = 1; u <= 0xFFFF; ++u) all.push_back(static_cast<char16_t>(u));
    std::string encoded = Encode(all);
    ASSERT_EQ(encoded.size(), 4 * all.size());
    for (size_t i = 0; i < all.size(); ++i) {
        const std::string group = encoded.substr(4 * i, 4);
        ASSERT_EQ(group.find_first_not_of("0123456789abcdef"), std::string::npos) << group;
        ASSERT_EQ(strtoul(group.c_str(), nullptr, 16), all[i]) << "unit " << i;
    }
}

TEST(EncodeArgument, EmptyTextLeavesTheBufferAlone) {
    char out[8] = "keepme";
    EncodeArgument(u"", out);
    EXPECT_STREQ(out, "keepme");
}

TEST(EncodeArgumentInto, EmptyFirstArgumentIsEmptyAndLaterOnesRepeat) {
    OwnedBuffer b;
    EXPECT_EQ(b.Put(u""), "");
    EXPECT_EQ(b.Put(u"ab"), "00610062");
    EXPECT_EQ(b.Put(u""), "00610062");
    // A shorter argument after a longer one is not followed by the old tail.
    EXPECT_EQ(b.Put(u"c"), "0063");
}

TEST(EncodeArgumentInto, LongArgumentsAreEncodedWhole) {
    for (size_t units : {1023u, 1024u, 5000u, 32767u}) {
        std::u16string text;
        for (size_t i = 0; i < units; ++i) text.push_back(static_cast<char16_t>(0x4E00 + i % 200));
        OwnedBuffer b;
        b.Put(u"x");
        std::string encoded = b.Put(text);
        ASSERT_EQ(encoded.size(), 4 * units);
        EXPECT_EQ(encoded, Encode(text));
        EXPECT_GE(b.buffer.capacity, 4 * units + 1);
        // Growing keeps serving: an empty argument repeats the long encoding.
        EXPECT_EQ(b.Put(u""), encoded);
    }
}

}  // namespace
