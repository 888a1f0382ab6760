#include <gtest/gtest.h>

#include <set>
#include <stdexcept>
#include <vector>

#include "foundation/core/Guid.h"

TEST(Guid, TextFormRoundTripsAndUniqueOnesDiffer)
{
    const Guid guid(0x5d26c4f8, 0x0ae1, 0x47b3, 0x9c, 0x15, 0xc3, 0xe7, 0xb0, 0x92, 0x6d, 0x41);
    EXPECT_EQ(guid.AsStdString(), "5D26C4F8-0AE1-47B3-9C15-C3E7B0926D41");
    EXPECT_EQ(StringToGUID("5d26c4f8-0ae1-47b3-9c15-c3e7b0926d41", 36), guid);
    EXPECT_EQ(Guid().AsStdString(), "00000000-0000-0000-0000-000000000000");
    std::set<Guid> seen;
    for (int i = 0; i < 1000; ++i) {
        const Guid unique = Guid::CreateUnique();
        EXPECT_FALSE(unique.IsNil());
        EXPECT_TRUE(seen.insert(unique).second);
        EXPECT_EQ(StringToGUID(unique.AsUTF8String()), unique);
    }
}

TEST(Guid, ParseReadsOnlyTheTextItIsGivenAndRefusesBadText)
{
    // Exactly 36 bytes with no terminator: the address sanitizer sees a read past the end.
    const std::string good = "0123ABCD-4567-89ab-cdef-0123456789AB";
    const std::vector<unsigned char> exact(good.begin(), good.end());
    EXPECT_EQ(StringToGUID(exact.data(), exact.size()).AsStdString(), "0123ABCD-4567-89AB-CDEF-0123456789AB");

    const std::pair<const char*, std::size_t> bad[] = {{good.c_str(), 35},
                                                       {good.c_str(), 0},
                                                       {"0123ABCD-4567-89ab-cdef-0123456789ABC", 37},
                                                       {"0123ABCG-4567-89ab-cdef-0123456789AB", 36},
                                                       {"0123ABCD-4567-89ab-cdef+0123456789AB", 36},
                                                       {"0123ABCD 4567 89ab cdef 0123456789AB", 36},
                                                       {"0123ABCD-4567-89ab-cdef-0123456789A\0", 36},
                                                       {nullptr, 36}};
    for (const auto& text : bad)
        EXPECT_THROW(StringToGUID(text.first, text.second), std::invalid_argument)
            << (text.first ? text.first : "null");
}
