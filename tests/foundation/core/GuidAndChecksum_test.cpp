// GUIDs as text, and the content checksum that the cache file keeps as one.

#include <gtest/gtest.h>

#include <set>
#include <stdexcept>
#include <string>
#include <vector>

#include "foundation/core/Guid.h"
#include "foundation/core/Hash.h"

TEST(Guid, TextFormRoundTripsUniqueOnesDifferAndBadTextIsRefused)
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

// The checksum fold persists in users' cache files: these golden values must
// never change, whatever hash is underneath.
namespace {

std::vector<unsigned char> Pattern(size_t size)
{
    std::vector<unsigned char> bytes(size);
    for (size_t i = 0; i < size; ++i) bytes[i] = static_cast<unsigned char>(i * 31 + 7);
    return bytes;
}

// The content checksum as the engine forms it: a marker, then blocks of
// 10,240 bytes, the fourth word carrying the running count of bytes.
std::string Checksum(const std::vector<unsigned char>& content)
{
    HashValue value;
    value.mWords[3] = 8;
    MixHash::MixInData(value, reinterpret_cast<const unsigned char*>("SyncFile"), 8);
    for (size_t offset = 0; offset < content.size(); offset += 10240) {
        const size_t block = std::min<size_t>(10240, content.size() - offset);
        value.mWords[3] += static_cast<unsigned>(block);
        MixHash::MixInData(value, content.data() + offset, block);
    }
    const Guid guid(value.mWords[0], value.mWords[1] >> 16, value.mWords[1] & 0xFFFF, value.mWords[2] >> 24,
                    value.mWords[2] >> 16, value.mWords[2] >> 8, value.mWords[2], value.mWords[3] >> 24,
                    value.mWords[3] >> 16, value.mWords[3] >> 8, value.mWords[3]);
    return guid.AsStdString();
}

}  // namespace

TEST(MixHash, GoldenChecksumsStayTheSameAndAnyByteChangesThem)
{
    EXPECT_EQ(Checksum(Pattern(0)), "258FA239-3494-D72F-1472-296CEA713D18");
    EXPECT_EQ(Checksum(Pattern(10240)), "3B3611E2-E2F7-6F92-5C4F-AEBA17BECDF5");
    EXPECT_EQ(Checksum(Pattern(10241)), "13A2562E-CB9A-1E9B-571B-E3FB82C308B0");
    std::vector<unsigned char> content = Pattern(30000);
    const std::string first = Checksum(content);
    content[29999] ^= 1;
    EXPECT_NE(Checksum(content), first);
}
