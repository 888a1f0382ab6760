// Parsing and printing JSON trees, against Boost.JSON's own DOM on the same
// text: a listing of a few thousand assets, as the asset service answers it.

#include <benchmark/benchmark.h>

#include <boost/json.hpp>

#include <cstdio>
#include <string>

#include "foundation/json/JSONText.h"

using namespace tolmocore::serialization;

namespace {

std::string AssetListing(int count)
{
    std::string text = "[";
    char entry[1024];
    for (int i = 0; i < count; ++i) {
        std::snprintf(entry, sizeof entry,
                      "%s{\"id\":\"%08X-4B1C-4F2A-9D3E-%012X\",\"name\":\"Preset %d \\u00e9t\\u00e9.xmp\","
                      "\"path\":\"/prefs/14.0/Presets/Group %d/Preset %d.xmp\",\"type\":\"application/"
                      "octet-stream\",\"size\":%d,\"version\":%d,\"ratio\":%d.%03d,\"hidden\":%s,"
                      "\"etag\":\"\\\"%016x\\\"\",\"created\":\"2014-03-05T09:41:%02d.123+00:00\","
                      "\"modified\":\"2016-11-23T17:46:%02d+00:00\",\"md5\":\"%032x\","
                      "\"links\":{\"self\":\"/api/assets/%d\",\"parent\":\"/api/collections/%d\","
                      "\"content\":null},\"tags\":[\"preset\",\"group-%d\"]}",
                      i ? "," : "", 0x10000000u + i, i * 7919, i, i % 40, i, 1024 + i * 37, i % 9,
                      i % 100, i % 1000, i % 3 ? "false" : "true", i * 2654435761u, i % 60, i % 60,
                      i * 40503u, i, i % 40, i % 40);
        text += entry;
    }
    return text + "]";
}

const std::string& Listing()
{
    static const std::string text = AssetListing(3000);
    return text;
}

void BM_JSONParseAnyTree(benchmark::State& state)
{
    const UTF8String text(Listing());
    for (auto _ : state) benchmark::DoNotOptimize(JSONParse(text));
    state.SetBytesProcessed(state.iterations() * text.size());
}
BENCHMARK(BM_JSONParseAnyTree)->Unit(benchmark::kMillisecond);

void BM_JSONParseBoostDOM(benchmark::State& state)
{
    const std::string& text = Listing();
    for (auto _ : state) benchmark::DoNotOptimize(boost::json::parse(text));
    state.SetBytesProcessed(state.iterations() * text.size());
}
BENCHMARK(BM_JSONParseBoostDOM)->Unit(benchmark::kMillisecond);

void BM_JSONPrintAnyTree(benchmark::State& state)
{
    const boost::any tree = JSONParse(UTF8String(Listing()));
    std::size_t size = 0;
    for (auto _ : state) {
        const UTF8String text = GetJSONUTF8String(tree, false);
        size = text.size();
        benchmark::DoNotOptimize(text.data());
    }
    state.SetBytesProcessed(state.iterations() * size);
}
BENCHMARK(BM_JSONPrintAnyTree)->Unit(benchmark::kMillisecond);

void BM_JSONPrintBoostDOM(benchmark::State& state)
{
    const boost::json::value tree = boost::json::parse(Listing());
    std::size_t size = 0;
    for (auto _ : state) {
        const std::string text = boost::json::serialize(tree);
        size = text.size();
        benchmark::DoNotOptimize(text.data());
    }
    state.SetBytesProcessed(state.iterations() * size);
}
BENCHMARK(BM_JSONPrintBoostDOM)->Unit(benchmark::kMillisecond);

}  // namespace
