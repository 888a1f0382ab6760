#include <gtest/gtest.h>

#include <set>
#include <sstream>
#include <stdexcept>
#include <vector>

#include "foundation/core/Guid.h"

TEST(Guid, TextFormRoundTripsAndPrintsTheSame)
{
    const Guid guid(0x5d26c4f8, 0x0ae1, 0x47b3, 0x9c, 0x15, 0xc3, 0xe7, 0xb0, 0x92, 0x6d, 0x41);
    EXPECT_EQ(guid.AsStdString(), "5D26C4F8-0AE1-47B3-9C15-C3E7B0926D41");
    EXPECT_EQ(StringToGUID("5d26c4f8-0ae1-47b3-9c15-c3e7b0926d41", 36), guid);
    std::ostringstream printed;
    printed << guid;
    EXPECT_EQ(printed.str(), guid.AsStdString());
}

TEST(Guid, NilIsAllZeroAndUniqueOnesAreNot)
{
    EXPECT_TRUE(Guid().IsNil());
    EXPECT_EQ(Guid().AsStdString(), "00000000-0000-0000-0000-000000000000");
    std::set<Guid> seen;
    for (int i = 0; i < 1000; ++i) {
        const Guid guid = Guid::CreateUnique();
        EXPECT_FALSE(guid.IsNil());
        EXPECT_TRUE(seen.insert(guid).second);
        EXPECT_EQ(StringToGUID(guid.AsUTF8String()), guid);
    }
}

TEST(Guid, ParseReadsOnlyTheTextItIsGiven)
{
    // Exactly 36 bytes with no terminator: a read past the end would be
    // caught by the address sanitizer.
    const std::string text = "0123ABCD-4567-89ab-cdef-0123456789AB";
    std::vector<unsigned char> exact(text.begin(), text.end());
    EXPECT_EQ(StringToGUID(exact.data(), exact.size()).AsStdString(), "0123ABCD-4567-89AB-CDEF-0123456789AB");
}

TEST(Guid, BadTextThrows)
{
    const char* good = "0123ABCD-4567-89ab-cdef-0123456789AB";
    EXPECT_THROW(StringToGUID(good, 35), std::invalid_argument);
    EXPECT_THROW(StringToGUID(good, 0), std::invalid_argument);
    EXPECT_THROW(StringToGUID("0123ABCD-4567-89ab-cdef-0123456789ABC", 37), std::invalid_argument);
    EXPECT_THROW(StringToGUID("0123ABCG-4567-89ab-cdef-0123456789AB", 36), std::invalid_argument);
    EXPECT_THROW(StringToGUID("0123ABCD-4567-89ab-cdef+0123456789AB", 36), std::invalid_argument);
    EXPECT_THROW(StringToGUID("0123ABCD 4567 89ab cdef 0123456789AB", 36), std::invalid_argument);
    EXPECT_THROW(StringToGUID(std::string("0123ABCD-4567-89ab-cdef-0123456789A\0", 36).c_str(), 36),
                 std::invalid_argument);
    EXPECT_THROW(StringToGUID(static_cast<const char*>(nullptr), 36), std::invalid_argument);
}
