#include "foundation/core/Guid.h"

#include <cstring>
#include <random>
#include <stdexcept>
#include <tuple>

Guid::Guid() noexcept : mData1(0), mData2(0), mData3(0), mData4{} {}

Guid::Guid(unsigned int data1, unsigned short data2, unsigned short data3, unsigned char b0,
           unsigned char b1, unsigned char b2, unsigned char b3, unsigned char b4,
           unsigned char b5, unsigned char b6, unsigned char b7) noexcept
    : mData1(data1), mData2(data2), mData3(data3), mData4{b0, b1, b2, b3, b4, b5, b6, b7}
{
}

Guid Guid::CreateUnique()
{
    // One generator per thread, seeded from the system's entropy: no lock and
    // no shared state between threads.
    thread_local std::mt19937_64 generator([] {
        std::random_device device;
        std::seed_seq seed{device(), device(), device(), device(), device(), device()};
        return std::mt19937_64(seed);
    }());
    const unsigned long long high = generator();
    const unsigned long long low = generator();
    Guid guid(static_cast<unsigned int>(high >> 32), static_cast<unsigned short>(high >> 16),
              static_cast<unsigned short>((high & 0x0FFF) | 0x4000),  // version 4
              static_cast<unsigned char>(((low >> 56) & 0x3F) | 0x80),  // variant 1
              static_cast<unsigned char>(low >> 48), static_cast<unsigned char>(low >> 40),
              static_cast<unsigned char>(low >> 32), static_cast<unsigned char>(low >> 24),
              static_cast<unsigned char>(low >> 16), static_cast<unsigned char>(low >> 8),
              static_cast<unsigned char>(low));
    return guid;
}

bool Guid::IsNil() const noexcept { return *this == Guid(); }

std::string Guid::AsStdString() const
{
    static const char kHex[] = "0123456789ABCDEF";
    std::string text;
    text.reserve(36);
    auto put = [&](unsigned long long value, int digits) {
        for (int shift = (digits - 1) * 4; shift >= 0; shift -= 4) text.push_back(kHex[(value >> shift) & 0xF]);
    };
    put(mData1, 8);
    text.push_back('-');
    put(mData2, 4);
    text.push_back('-');
    put(mData3, 4);
    text.push_back('-');
    put(mData4[0], 2);
    put(mData4[1], 2);
    text.push_back('-');
    for (int i = 2; i < 8; ++i) put(mData4[i], 2);
    return text;
}

UTF8String Guid::AsUTF8String() const { return UTF8String(AsStdString()); }

bool operator==(const Guid& left, const Guid& right) noexcept
{
    return left.mData1 == right.mData1 && left.mData2 == right.mData2 &&
           left.mData3 == right.mData3 && std::memcmp(left.mData4, right.mData4, 8) == 0;
}

bool operator!=(const Guid& left, const Guid& right) noexcept { return !(left == right); }

bool operator<(const Guid& left, const Guid& right) noexcept
{
    const int tail = std::memcmp(left.mData4, right.mData4, 8);
    return std::tie(left.mData1, left.mData2, left.mData3) <
               std::tie(right.mData1, right.mData2, right.mData3) ||
           (std::tie(left.mData1, left.mData2, left.mData3) ==
                std::tie(right.mData1, right.mData2, right.mData3) &&
            tail < 0);
}

namespace {

int HexValue(unsigned char c)
{
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

}  // namespace

Guid StringToGUID(const unsigned char* text, unsigned long length)
{
    if (length != 36 || text == nullptr)
        throw std::invalid_argument("Guid text must be 36 characters");
    unsigned char bytes[16];
    int count = 0;
    for (unsigned long i = 0; i < 36; ++i) {
        if (i == 8 || i == 13 || i == 18 || i == 23) {
            if (text[i] != '-') throw std::invalid_argument("Guid text has no dash where one belongs");
            continue;
        }
        const int high = HexValue(text[i]);
        const int low = HexValue(text[i + 1]);
        if (high < 0 || low < 0) throw std::invalid_argument("Guid text holds a character that is not hex");
        bytes[count++] = static_cast<unsigned char>(high * 16 + low);
        ++i;
    }
    return Guid((unsigned(bytes[0]) << 24) | (unsigned(bytes[1]) << 16) | (unsigned(bytes[2]) << 8) | bytes[3],
                static_cast<unsigned short>((bytes[4] << 8) | bytes[5]),
                static_cast<unsigned short>((bytes[6] << 8) | bytes[7]), bytes[8], bytes[9], bytes[10],
                bytes[11], bytes[12], bytes[13], bytes[14], bytes[15]);
}

Guid StringToGUID(const char* text, unsigned long length)
{
    return StringToGUID(reinterpret_cast<const unsigned char*>(text), length);
}

Guid StringToGUID(const UTF8String& text) { return StringToGUID(text.data(), text.size()); }

std::ostream& operator<<(std::ostream& stream, const Guid& guid) { return stream << guid.AsStdString(); }
