#pragma once
// A 128-bit running hash. Its value persists in users' cache files (through
// content checksums), so what MixInData computes must never change: a test
// pins golden values.

#include <cstdint>

struct HashValue {
    // Set by hand before the first mix.
    std::uint32_t mWords[4] = {0, 0, 0, 0};
};

class MixHash {
public:
    // Folds the bytes into the value: the new value is XXH3-128 over the
    // current value (16 bytes, words in order, little-endian) followed by the
    // bytes. Deterministic across runs and machines; fills all four words.
    static void MixInData(HashValue& value, const unsigned char* data, unsigned long length);
};
