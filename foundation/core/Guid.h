#pragma once
// A 16-byte identifier. The all-zero value means "no identifier": every
// network request carries a fresh one, and a nil one says no request was made.

#include <array>
#include <ostream>

#include "foundation/core/Strings.h"

class Guid {
public:
    Guid() noexcept;
    Guid(unsigned int data1, unsigned short data2, unsigned short data3, unsigned char b0,
         unsigned char b1, unsigned char b2, unsigned char b3, unsigned char b4, unsigned char b5,
         unsigned char b6, unsigned char b7) noexcept;

    // A random (version 4) identifier; callable from any thread at once.
    static Guid CreateUnique();

    bool IsNil() const noexcept;

    // "XXXXXXXX-XXXX-XXXX-XXXX-XXXXXXXXXXXX", 36 characters, upper-case hex.
    UTF8String AsUTF8String() const;
    std::string AsStdString() const;

    unsigned int mData1;
    unsigned short mData2;
    unsigned short mData3;
    unsigned char mData4[8];
};

bool operator==(const Guid& left, const Guid& right) noexcept;
bool operator!=(const Guid& left, const Guid& right) noexcept;
bool operator<(const Guid& left, const Guid& right) noexcept;

// Parses the 36-character text form, in either case. Reads `length` bytes of
// `text` and never more. A length other than 36, a misplaced dash or a
// character that is not hex throws std::invalid_argument.
Guid StringToGUID(const unsigned char* text, unsigned long length);
Guid StringToGUID(const char* text, unsigned long length);
Guid StringToGUID(const UTF8String& text);

std::ostream& operator<<(std::ostream& stream, const Guid& guid);
