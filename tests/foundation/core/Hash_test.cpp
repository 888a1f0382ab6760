// The checksum fold persists in users' cache files: these golden values must
// never change.

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include <xxhash.h>

#include "foundation/core/Guid.h"
#include "foundation/core/Hash.h"

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

TEST(MixHash, IsXxh3OverTheRunningValueAndTheBlock)
{
    HashValue value;
    value.mWords[0] = 0x01020304;
    value.mWords[3] = 0xA0B0C0D0;
    const std::vector<unsigned char> block = Pattern(1000);
    std::vector<unsigned char> joined = {0x04, 0x03, 0x02, 0x01, 0, 0, 0, 0, 0, 0, 0, 0, 0xD0, 0xC0, 0xB0, 0xA0};
    joined.insert(joined.end(), block.begin(), block.end());
    const XXH128_hash_t expected = XXH3_128bits(joined.data(), joined.size());

    MixHash::MixInData(value, block.data(), block.size());
    EXPECT_EQ(value.mWords[0], static_cast<uint32_t>(expected.high64 >> 32));
    EXPECT_EQ(value.mWords[1], static_cast<uint32_t>(expected.high64));
    EXPECT_EQ(value.mWords[2], static_cast<uint32_t>(expected.low64 >> 32));
    EXPECT_EQ(value.mWords[3], static_cast<uint32_t>(expected.low64));
}
