// Speed of the table parser on a synthetic table of many structures.
#include <benchmark/benchmark.h>

#include <vector>

#include "smbios/SmBios.h"

namespace {

// A table of count structures of 0x20 formatted bytes and three strings each.
std::vector<unsigned char> syntheticTable(unsigned int count) {
    std::vector<unsigned char> raw;
    for (unsigned int i = 0; i < count; ++i) {
        unsigned int const start = static_cast<unsigned int>(raw.size());
        raw.resize(start + 0x20, 0);
        raw[start] = static_cast<unsigned char>(i % 40);
        raw[start + 1] = 0x20;
        raw[start + 2] = static_cast<unsigned char>(i & 0xFF);
        raw[start + 3] = static_cast<unsigned char>(i >> 8);
        for (char const* s : {"Manufacturer Name", "Product 1234", "Serial0001"}) {
            for (; *s != '\0'; ++s) {
                raw.push_back(static_cast<unsigned char>(*s));
            }
            raw.push_back(0);
        }
        raw.push_back(0);
    }
    return raw;
}

void BM_ParseTable(benchmark::State& state) {
    std::vector<unsigned char> const raw =
        syntheticTable(static_cast<unsigned int>(state.range(0)));
    for (auto _ : state) {
        SD::SmBios parsed(raw);
        benchmark::DoNotOptimize(parsed.getTables().data());
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) *
                            static_cast<int64_t>(raw.size()));
}
BENCHMARK(BM_ParseTable)->Arg(64)->Arg(620)->Arg(2000);

}  // namespace

BENCHMARK_MAIN();
