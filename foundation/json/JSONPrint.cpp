#include <charconv>
#include <cmath>
#include <cstring>
#include <string>
#include <typeinfo>

#include <boost/core/demangle.hpp>

#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTree.h"

namespace tolmocore {
namespace serialization {
namespace {

// Length of the valid UTF-8 sequence at the start of `bytes`, or 0 if there
// is none: overlong forms, surrogates and values past U+10FFFF are invalid,
// as they are to the parser.
std::size_t ValidSequenceLength(const unsigned char* bytes, std::size_t size)
{
    const unsigned char lead = bytes[0];
    std::size_t length;
    unsigned char low = 0x80, high = 0xBF;  // range of the second byte
    if (lead >= 0xC2 && lead <= 0xDF) {
        length = 2;
    } else if (lead >= 0xE0 && lead <= 0xEF) {
        length = 3;
        if (lead == 0xE0) low = 0xA0;
        if (lead == 0xED) high = 0x9F;
    } else if (lead >= 0xF0 && lead <= 0xF4) {
        length = 4;
        if (lead == 0xF0) low = 0x90;
        if (lead == 0xF4) high = 0x8F;
    } else {
        return 0;
    }
    if (size < length || bytes[1] < low || bytes[1] > high) return 0;
    for (std::size_t i = 2; i < length; ++i) {
        if ((bytes[i] & 0xC0) != 0x80) return 0;
    }
    return length;
}

// What a value holds. Kind_Other is no JSON.
enum Kind {
    Kind_String,
    Kind_Object,
    Kind_Array,
    Kind_Integer,
    Kind_Bool,
    Kind_Double,
    Kind_Unsigned,
    Kind_Other
};

// Almost always one type_info object stands for a type, so comparing
// addresses settles the kind with one load per candidate; an equal type
// described by a second object (from another module) takes the full
// comparison, which compares names.
Kind KindOf(const std::type_info& type)
{
    static const std::type_info* const kTypes[] = {
        &typeid(UTF8String), &typeid(JSONObject), &typeid(JSONArray),
        &typeid(long long),  &typeid(bool),       &typeid(double),
        &typeid(unsigned long long)};
    for (int kind = 0; kind < Kind_Other; ++kind) {
        if (&type == kTypes[kind]) return static_cast<Kind>(kind);
    }
    for (int kind = 0; kind < Kind_Other; ++kind) {
        if (type == *kTypes[kind]) return static_cast<Kind>(kind);
    }
    return Kind_Other;
}

// Bytes that go out as they are: printable ASCII but the quote and the backslash.
struct PlainBytes {
    constexpr PlainBytes() : mPlain()
    {
        for (int byte = 0x20; byte < 0x80; ++byte) mPlain[byte] = byte != '"' && byte != '\\';
    }
    constexpr bool operator[](unsigned char byte) const { return mPlain[byte]; }
    bool mPlain[256];
};
constexpr PlainBytes kPlain;

class Printer {
public:
    explicit Printer(UTF8String& out) : mOut(out) {}

    void Print(const boost::any* value, std::size_t depth)
    {
        if (!value || value->empty()) {
            Append("null", 4);
            return;
        }
        switch (KindOf(value->type())) {
            case Kind_String:
                PrintString(*boost::unsafe_any_cast<UTF8String>(value));
                break;
            case Kind_Object: {
                CheckDepth(depth);
                mOut.push_back('{');
                bool first = true;
                for (const JSONObject::value_type& member : *boost::unsafe_any_cast<JSONObject>(value)) {
                    if (!first) mOut.push_back(',');
                    first = false;
                    PrintString(member.first);
                    mOut.push_back(':');
                    Print(member.second.get(), depth + 1);
                }
                mOut.push_back('}');
                break;
            }
            case Kind_Array: {
                CheckDepth(depth);
                mOut.push_back('[');
                bool first = true;
                for (const boost::shared_ptr<boost::any>& element :
                     *boost::unsafe_any_cast<JSONArray>(value)) {
                    if (!first) mOut.push_back(',');
                    first = false;
                    Print(element.get(), depth + 1);
                }
                mOut.push_back(']');
                break;
            }
            case Kind_Integer:
                PrintNumber(*boost::unsafe_any_cast<long long>(value));
                break;
            case Kind_Bool:
                if (*boost::unsafe_any_cast<bool>(value)) {
                    Append("true", 4);
                } else {
                    Append("false", 5);
                }
                break;
            case Kind_Double:
                PrintDouble(*boost::unsafe_any_cast<double>(value));
                break;
            case Kind_Unsigned:
                PrintNumber(*boost::unsafe_any_cast<unsigned long long>(value));
                break;
            case Kind_Other:
                throw JSONError(std::string("a JSON tree cannot hold a value of type ") +
                                boost::core::demangle(value->type().name()));
        }
    }

private:
    // `depth` counts the containers above this one.
    static void CheckDepth(std::size_t depth)
    {
        if (depth >= kJSONMaxDepth) {
            throw JSONError("JSON tree nested deeper than " + std::to_string(kJSONMaxDepth) +
                            " levels");
        }
    }

    void Append(const char* text, std::size_t size)
    {
        mOut.append(reinterpret_cast<const unsigned char*>(text), size);
    }

    template <class Integer>
    void PrintNumber(Integer value)
    {
        char buffer[24];
        const std::to_chars_result result = std::to_chars(buffer, buffer + sizeof buffer, value);
        Append(buffer, result.ptr - buffer);
    }

    void PrintDouble(double value)
    {
        if (std::isnan(value)) throw JSONError("JSON has no form for NaN");
        if (std::isinf(value)) {
            if (value < 0) {
                Append("-1e999", 6);
            } else {
                Append("1e999", 5);
            }
            return;
        }
        char buffer[32];
        const std::to_chars_result result = std::to_chars(buffer, buffer + sizeof buffer, value);
        const std::size_t size = result.ptr - buffer;
        Append(buffer, size);
        // "1" would read back as an integer.
        if (!std::memchr(buffer, '.', size) && !std::memchr(buffer, 'e', size)) Append(".0", 2);
    }

    void PrintString(const UTF8String& text)
    {
        static const char kHex[] = "0123456789abcdef";
        const unsigned char* const bytes = text.data();
        const std::size_t size = text.size();
        mOut.push_back('"');
        std::size_t run = 0;  // start of the bytes that go out as they are
        std::size_t i = 0;
        while (i < size) {
            const unsigned char byte = bytes[i];
            if (kPlain[byte]) {
                ++i;
                continue;
            }
            if (byte >= 0x80) {
                if (const std::size_t length = ValidSequenceLength(bytes + i, size - i)) {
                    i += length;
                    continue;
                }
            }
            mOut.append(bytes + run, i - run);
            switch (byte) {
                case '"': Append("\\\"", 2); break;
                case '\\': Append("\\\\", 2); break;
                case '\b': Append("\\b", 2); break;
                case '\f': Append("\\f", 2); break;
                case '\n': Append("\\n", 2); break;
                case '\r': Append("\\r", 2); break;
                case '\t': Append("\\t", 2); break;
                default:
                    if (byte < 0x20) {
                        const char escape[] = {'\\', 'u', '0', '0', kHex[byte >> 4],
                                               kHex[byte & 0xF]};
                        Append(escape, sizeof escape);
                    } else {
                        Append("\xEF\xBF\xBD", 3);  // U+FFFD for a byte that is no UTF-8
                    }
            }
            run = ++i;
        }
        mOut.append(bytes + run, size - run);
        mOut.push_back('"');
    }

    UTF8String& mOut;
};

}  // namespace

UTF8String GetJSONUTF8String(const boost::any& value, bool)
{
    UTF8String text;
    Printer(text).Print(&value, 0);
    return text;
}

}  // namespace serialization
}  // namespace tolmocore
