// Host services on the converter's hot paths: the name tree behind the signal
// caches (one lookup per signal reference while reading) and the buffered
// stream behind the text writer (one write per item).
//
//   build/bin/host_bench
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdio>
#include <random>
#include <string>
#include <unordered_map>
#include <vector>

#include "port_file.h"
#include "ut_btr_tree.h"
#include "ut_str.h"

namespace {

struct Sig {
    std::string name;
};

int compare_sig(const Sig* s, const char* key) {
    return UT_STR::Compare(s->name.c_str(), key);
}

std::vector<Sig> make_signals(std::size_t n) {
    std::vector<Sig> sigs(n);
    for (std::size_t i = 0; i < n; ++i)
        sigs[i].name = "n" + std::to_string(i * 7919 % n);
    return sigs;
}

// Each signal referenced three times, in a fixed random order.
std::vector<const Sig*> shuffled_references(const std::vector<Sig>& sigs) {
    std::vector<const Sig*> refs;
    for (const Sig& s : sigs)
        refs.insert(refs.end(), 3, &s);
    std::shuffle(refs.begin(), refs.end(), std::mt19937(1));
    return refs;
}

// A reader's pattern: each name is created once, then referenced a few more times.
void BM_NameTreeFindOrCreate(benchmark::State& state) {
    const std::vector<Sig> sigs = make_signals(static_cast<std::size_t>(state.range(0)));
    const std::vector<const Sig*> refs = shuffled_references(sigs);
    for (auto _ : state) {
        UT_BTR_TREE<const Sig> tree(compare_sig);
        std::size_t created = 0;
        for (const Sig* ref : refs) {
            const Sig*& slot = tree.add(ref->name.c_str());
            if (slot == nullptr) {
                slot = ref;
                ++created;
            }
        }
        benchmark::DoNotOptimize(created);
    }
    state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * refs.size()));
}
BENCHMARK(BM_NameTreeFindOrCreate)->Arg(1000)->Arg(1000000)->Unit(benchmark::kMillisecond);

// The writer's pattern: short items, some ending a line, through a 4096-byte buffer.
void BM_StreamWriteItems(benchmark::State& state) {
    const char* items[] = {"   PRIM", " AND", " 2", " (NAME=g123456)", "\r\n"};
    std::size_t bytes = 0;
    for (auto _ : state) {
        Port::Stream out(Port::ACCESS_WRITE, 4096);
        if (Port::File::open("/dev/null", &out, true) == nullptr) {
            state.SkipWithError("cannot open /dev/null");
            return;
        }
        for (int i = 0; i < 1000000; ++i) {
            for (const char* item : items) {
                const std::size_t len = UT_STR::Len(item);
                out.write(item, len);
                bytes += len;
            }
        }
        Port::File::close(&out);
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(bytes));
}
BENCHMARK(BM_StreamWriteItems)->Unit(benchmark::kMillisecond);

// Peer: the standard hash map keyed by a copy of each name.
void BM_StdUnorderedMapFindOrCreate(benchmark::State& state) {
    const std::vector<Sig> sigs = make_signals(static_cast<std::size_t>(state.range(0)));
    const std::vector<const Sig*> refs = shuffled_references(sigs);
    for (auto _ : state) {
        std::unordered_map<std::string, const Sig*> map;
        std::size_t created = 0;
        for (const Sig* ref : refs) {
            auto [it, fresh] = map.try_emplace(ref->name, ref);
            created += fresh;
        }
        benchmark::DoNotOptimize(created);
    }
    state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * refs.size()));
}
BENCHMARK(BM_StdUnorderedMapFindOrCreate)->Arg(1000)->Arg(1000000)->Unit(benchmark::kMillisecond);
}  // namespace
