// Query quoting: a search query's JSON, mostly characters that need quoting.

#include <benchmark/benchmark.h>

#include "foundation/net/QuoteURL.h"

namespace {

void BM_QuoteURL(benchmark::State& state)
{
    tolmonet::FormList pairs;
    pairs.emplace_back(ImmutableString::CreateStatic("q"),
                       UTF8String("{\"name\":\"Pr\xC3\xA9" "f\xC3\xA9rences 9.2\",\"type\":\"application/"
                                  "vnd.example.collection+json\",\"scope\":[\"5d26c4f8-0ae1-47b3\"]}"));
    pairs.emplace_back(ImmutableString::CreateStatic("metadata"), UTF8String("true"));
    size_t bytes = 0;
    for (const auto& pair : pairs) bytes += pair.first.size() + pair.second.size();
    for (auto _ : state) benchmark::DoNotOptimize(tolmonet::QuoteURL(pairs));
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * bytes));
}

}  // namespace

BENCHMARK(BM_QuoteURL);
