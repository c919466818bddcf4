#include "Vesk_StringBase.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <vector>

namespace {

using Str = Vesk::StringBase<char>;

std::vector<std::string> Tokens(const Str& text, const char* separators) {
    std::vector<std::string> tokens;
    Str::size_type pos = 0, start = 0, length = 0;
    while (text.NextTokenRange(separators, pos, start, length)) {
        tokens.push_back(text.substr(start, length));
    }
    return tokens;
}

TEST(VeskStringBase, ConstructionKeepsEveryByteAndNullIsEmpty) {
    EXPECT_EQ(Str(static_cast<const char*>(nullptr)), "");
    const Str withZero("a\0b", 3);
    EXPECT_EQ(withZero.size(), 3u);
    Str assigned;
    assigned = static_cast<const char*>(nullptr);
    EXPECT_TRUE(assigned.empty());
}

TEST(VeskStringBase, FormatReplacesContentWithTextOfAnyLength) {
    Str text = "old";
    text.Format("%s:%u:%d", "POOL", 5u, -2);
    EXPECT_EQ(text, "POOL:5:-2");
    const std::string longName(1000, 'x');
    text.Format("<%s>", longName.c_str());
    EXPECT_EQ(text, "<" + longName + ">");
}

TEST(VeskStringBase, CompareIsBytewiseUnsignedAndCaseSensitive) {
    EXPECT_LT(Str("a").Compare("b"), 0);
    EXPECT_LT(Str("ab").Compare("abc"), 0);
    EXPECT_EQ(Str("abc").Compare("abc"), 0);
    EXPECT_LT(Str("Z").Compare("a"), 0);
    EXPECT_GT(Str("\x80").Compare("a"), 0);  // a high byte sorts after ASCII
    EXPECT_LT(Str("a\0a", 3).Compare(Str("a\0b", 3)), 0);
    EXPECT_EQ(Str("ALL").CompareNoCase("all"), 0);
    EXPECT_NE(Str("alL").CompareNoCase("al"), 0);
}

TEST(VeskStringBase, ReplaceSubstitutesEveryOccurrenceOnce) {
    Str text = "a.b.c";
    EXPECT_EQ(text.Replace(".", "::"), 2u);
    EXPECT_EQ(text, "a::b::c");
    Str grows = "aa";
    EXPECT_EQ(grows.Replace("a", "aa"), 2u);  // the inserted text is not searched again
    EXPECT_EQ(grows, "aaaa");
    Str overlapping = "aaa";
    EXPECT_EQ(overlapping.Replace("aa", "b"), 1u);
    EXPECT_EQ(overlapping, "ba");
    EXPECT_EQ(overlapping.Replace("", "x"), 0u);
}

TEST(VeskStringBase, AppendTruncateTrimAndLastChar) {
    Str text = "ab";
    text.Append(' ', 3).Append('c', 1);
    EXPECT_EQ(text, "ab   c");
    text.Truncate(2);
    EXPECT_EQ(text, "ab");
    text.Truncate(10);
    EXPECT_EQ(text, "ab");
    Str padded = " \t name = 1 \t";
    padded.Trim();
    EXPECT_EQ(padded, "name = 1");
    Str blank = " \t ";
    blank.Trim();
    EXPECT_TRUE(blank.empty());
    EXPECT_EQ(Str("a=b=4").GetIndexOfLastChar('='), 3u);
    EXPECT_EQ(Str("abc").GetIndexOfLastChar('='), Str::npos);
}

TEST(VeskStringBase, NextTokenRangeYieldsEveryTokenIncludingEmptyOnes) {
    EXPECT_EQ(Tokens("A=1;B=2:C", ";:"), (std::vector<std::string>{"A=1", "B=2", "C"}));
    EXPECT_EQ(Tokens(";x;", ";"), (std::vector<std::string>{"", "x", ""}));
    EXPECT_EQ(Tokens("", ";"), (std::vector<std::string>{""}));
}

TEST(VeskStringBase, GetUINT32AcceptsExactlyTheDecimalRange) {
    std::uint32_t value = 7;
    EXPECT_TRUE(Str("4294967295").GetUINT32(value));
    EXPECT_EQ(value, 4294967295u);
    EXPECT_TRUE(Str("0").GetUINT32(value));
    EXPECT_EQ(value, 0u);
    value = 7;
    for (const char* bad : {"4294967296", "", "12a", "-1", " 5", "99999999999999999999"}) {
        EXPECT_FALSE(Str(bad).GetUINT32(value)) << bad;
        EXPECT_EQ(value, 7u) << bad;
        value = 7;
    }
}

TEST(VeskStringBase, LockedBufferIsFilledInPlace) {
    Str text = "keep";
    char* buffer = text.LockBuffer(16);
    EXPECT_EQ(std::string(buffer, 4), "keep");
    std::snprintf(buffer, 16, "%s", "filled");
    text.UnlockBuffer();
    EXPECT_EQ(text, "filled");
    text.LockBuffer(3);
    text.UnlockBuffer(2);
    EXPECT_EQ(text, "fi");
}

}  // namespace
