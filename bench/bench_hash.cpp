// The content checksum's fold against XXH3-128 over one buffer: the fold
// pays a reset and a digest per 10,240-byte block, and should keep at least
// 80% of the one-buffer throughput.

#include <benchmark/benchmark.h>

#include <vector>

#include <xxhash.h>

#include "foundation/core/Hash.h"

namespace {

constexpr size_t kBlock = 10240;

std::vector<unsigned char> Content(size_t size)
{
    std::vector<unsigned char> bytes(size);
    for (size_t i = 0; i < size; ++i) bytes[i] = static_cast<unsigned char>(i * 131 + 17);
    return bytes;
}

void BM_MixInDataBlocks(benchmark::State& state)
{
    const std::vector<unsigned char> content = Content(static_cast<size_t>(state.range(0)));
    for (auto _ : state) {
        HashValue value;
        value.mWords[3] = 8;
        for (size_t offset = 0; offset < content.size(); offset += kBlock) {
            const size_t block = std::min(kBlock, content.size() - offset);
            value.mWords[3] += static_cast<unsigned>(block);
            MixHash::MixInData(value, content.data() + offset, block);
        }
        benchmark::DoNotOptimize(value);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}

void BM_Xxh3OneBuffer(benchmark::State& state)
{
    const std::vector<unsigned char> content = Content(static_cast<size_t>(state.range(0)));
    for (auto _ : state) benchmark::DoNotOptimize(XXH3_128bits(content.data(), content.size()));
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}

}  // namespace

BENCHMARK(BM_MixInDataBlocks)->Arg(1 << 20)->Arg(16 << 20);
BENCHMARK(BM_Xxh3OneBuffer)->Arg(1 << 20)->Arg(16 << 20);
