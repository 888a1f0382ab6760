#include "foundation/core/Hash.h"

#define XXH_INLINE_ALL
#include <xxhash.h>

namespace {

void StoreLittleEndian(std::uint32_t word, unsigned char* out)
{
    out[0] = static_cast<unsigned char>(word);
    out[1] = static_cast<unsigned char>(word >> 8);
    out[2] = static_cast<unsigned char>(word >> 16);
    out[3] = static_cast<unsigned char>(word >> 24);
}

}  // namespace

void MixHash::MixInData(HashValue& value, const unsigned char* data, unsigned long length)
{
    unsigned char running[16];
    for (int i = 0; i < 4; ++i) StoreLittleEndian(value.mWords[i], running + 4 * i);

    // A state on the stack, and no copy of the block: the streaming interface
    // reads the running value and then the block in place.
    XXH3_state_t state;
    XXH3_INITSTATE(&state);
    XXH3_128bits_reset(&state);
    XXH3_128bits_update(&state, running, sizeof running);
    if (length) XXH3_128bits_update(&state, data, length);
    const XXH128_hash_t digest = XXH3_128bits_digest(&state);

    value.mWords[0] = static_cast<std::uint32_t>(digest.high64 >> 32);
    value.mWords[1] = static_cast<std::uint32_t>(digest.high64);
    value.mWords[2] = static_cast<std::uint32_t>(digest.low64 >> 32);
    value.mWords[3] = static_cast<std::uint32_t>(digest.low64);
}
