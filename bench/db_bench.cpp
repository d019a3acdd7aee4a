// The netlist database at scale: a design of one million two-input AND gates
// with random connections, built the way the text reader builds one (signals
// found or made by name through the converter's signal cache, one connection
// per pin), then written to a design file and read back.
//
//   build/bin/db_bench                       all figures
//   build/bin/db_bench --benchmark_filter=Memory
//
// Figures: build time; peak memory per pin of a process that only builds the
// design (everything included: arenas, tables, the signal cache, the
// process's own baseline); file write and read speed in MB/s; and the file
// read's speed as a fraction of a plain read() of the same bytes.
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "and_design.h"
#include "hx_library.h"
#include "port_file.h"
#include "port_msg.h"
#include "ut_ptrfile.h"
#include "vrx.h"

namespace {

/// Peak resident memory (bytes) of a child process that runs `work`.
template <class Work>
long child_peak_rss(Work work) {
    pid_t pid = fork();
    if (pid == 0) {
        work();
        _exit(0);
    }
    int status = 0;
    rusage usage{};
    wait4(pid, &status, 0, &usage);
    return usage.ru_maxrss * 1024L;
}

// First, while the process is still small: a child inherits the parent's
// resident pages, and memory freed by earlier benchmarks is not always given
// back to the system.
void BM_BuildPeakMemory(benchmark::State& state) {
    long peak = 0;
    long baseline = 0;
    for (auto _ : state) {
        baseline = child_peak_rss([] {});
        peak = child_peak_rss([] {
            HX_LIBRARY library("bench", 0);
            build_and_design(library, kGates);
        });
    }
    state.counters["bytes/pin"] = double(peak) / (double(kGates) * kPinsPerGate);
    state.counters["baseline_MB"] = double(baseline) / 1e6;
    state.counters["peak_MB"] = double(peak) / 1e6;
}
BENCHMARK(BM_BuildPeakMemory)->Unit(benchmark::kMillisecond)->Iterations(1);

void BM_BuildAndDesign(benchmark::State& state) {
    for (auto _ : state) {
        auto library = std::make_unique<HX_LIBRARY>("bench", 0);
        benchmark::DoNotOptimize(build_and_design(*library, kGates));
        state.PauseTiming();
        library.reset();
        state.ResumeTiming();
    }
    state.counters["pins/s"] = benchmark::Counter(
        double(kGates) * kPinsPerGate * state.iterations(), benchmark::Counter::kIsRate);
}
BENCHMARK(BM_BuildAndDesign)->Unit(benchmark::kMillisecond)->Iterations(3);

/// The design and a file holding it, made once for the file benchmarks.
struct FileFixture {
    FileFixture() : library("bench", 0), design(build_and_design(library, kGates)) {
        path = Port::File::tmpnam();
        write();
    }
    ~FileFixture() { Port::File::remove(path.c_str()); }

    bool write() {
        UT_PTRFILE file(Port::ACCESS_WRITE);
        if (!Port::File::open(path.c_str(), &file, false)) return false;
        bool ok = hx_env.write_design(&file, design);
        return Port::File::close(&file) && ok;
    }

    HX_DESIGN* read() {
        UT_PTRFILE file(Port::ACCESS_READ);
        if (!Port::File::open(path.c_str(), &file, false)) return nullptr;
        HX_DESIGN* loaded = hx_env.create_design(&file, 0);
        Port::File::close(&file);
        return loaded;
    }

    double plain_read_seconds() const {
        auto start = std::chrono::steady_clock::now();
        int fd = ::open(path.c_str(), O_RDONLY);
        std::vector<char> buffer(1 << 20);
        while (::read(fd, buffer.data(), buffer.size()) > 0) {
        }
        ::close(fd);
        return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    }

    long size() const {
        std::FILE* f = std::fopen(path.c_str(), "rb");
        std::fseek(f, 0, SEEK_END);
        long bytes = std::ftell(f);
        std::fclose(f);
        return bytes;
    }

    HX_LIBRARY library;
    HX_DESIGN* design;
    std::string path;
};

FileFixture& fixture() {
    static FileFixture instance;
    return instance;
}

void BM_WriteDesignFile(benchmark::State& state) {
    FileFixture& f = fixture();
    for (auto _ : state) {
        if (!f.write()) state.SkipWithError("design file not written");
    }
    state.SetBytesProcessed(int64_t(f.size()) * state.iterations());
    state.counters["file_MB"] = double(f.size()) / 1e6;
}
BENCHMARK(BM_WriteDesignFile)->Unit(benchmark::kMillisecond)->Iterations(3);

void BM_ReadDesignFile(benchmark::State& state) {
    FileFixture& f = fixture();
    double read_seconds = 0;
    double plain_seconds = 0;
    for (auto _ : state) {
        auto start = std::chrono::steady_clock::now();
        HX_DESIGN* loaded = f.read();
        read_seconds +=
            std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        state.PauseTiming();
        if (loaded == nullptr) {
            state.SkipWithError("design file not read");
            break;
        }
        hx_env.delete_library(loaded->get_library());
        plain_seconds += f.plain_read_seconds();
        state.ResumeTiming();
    }
    state.SetBytesProcessed(int64_t(f.size()) * state.iterations());
    state.counters["plain_read_MB/s"] = double(f.size()) * state.iterations() / plain_seconds / 1e6;
    state.counters["ratio_to_read"] = plain_seconds / read_seconds;
}
BENCHMARK(BM_ReadDesignFile)->Unit(benchmark::kMillisecond)->Iterations(3);

}  // namespace

int main(int argc, char** argv) {
    show_only_errors();
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
