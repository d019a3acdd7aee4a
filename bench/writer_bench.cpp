// The text writer at scale: the million-gate AND design, loaded from a design
// file, written as a text netlist; and the same bytes written line by line
// through a bare output stream, the floor that the writer's own work sits on.
//
//   build/bin/writer_bench                       all figures
//   build/bin/writer_bench --benchmark_filter=WriteText
//
// Figures: MB/s of each, and the writer's speed as a fraction of the bare
// stream's (ratio_to_raw; the bare stream is measured first, or on demand when
// filtered out). The writer's figure covers all of vrx_write: the temporary
// file, the copy to the destination and the removal of the temporary file.
// So BM_RawStreamCopied writes the bare bytes the same way (a temporary file,
// Port::File::copy, removal), and ratio_to_raw_copied compares like with like.
// Files live in a fresh folder under $TMPDIR (or /tmp), removed at the end.
#include <benchmark/benchmark.h>
#include <stdlib.h>

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "and_design.h"
#include "hx_library.h"
#include "port_file.h"
#include "port_msg.h"
#include "temp_folder.h"
#include "ut_ptrfile.h"
#include "vrx.h"

namespace {

namespace fs = std::filesystem;

constexpr std::size_t kStreamBuffer = 4096;  // the writer's own stream buffer

double seconds_since(std::chrono::steady_clock::time_point start) {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

/// The converter holding the design, the text it writes, and that text in
/// lines; made once for both benchmarks.
struct WriterFixture {
    WriterFixture() {
        const std::string& folder = temp.path;
        design_path = folder + "/ands.hxb";
        text_path = folder + "/ands.vrx";
        raw_path = folder + "/raw.vrx";
        raw_copy_path = folder + "/raw-copy.vrx";

        write_design_file();
        if (vrx.hxb_read(design_path.c_str()) != VX_OK || vrx.get_design() == nullptr) {
            throw std::runtime_error("design file not read");
        }
        if (vrx.vrx_write(text_path.c_str(), nullptr, 0) != VX_OK) {
            throw std::runtime_error("text file not written");
        }
        load_lines();
    }

    /// Builds the design in a library of its own and leaves only the file.
    void write_design_file() {
        HX_LIBRARY* library = hx_env.create_library("bench", 0);
        HX_DESIGN* design = build_and_design(*library, kGates);
        UT_PTRFILE file(Port::ACCESS_WRITE);
        bool ok = Port::File::open(design_path.c_str(), &file, false) != nullptr &&
                  hx_env.write_design(&file, design);
        ok = Port::File::close(&file) && ok;
        hx_env.delete_library(library);
        if (!ok) throw std::runtime_error("design file not written");
    }

    /// The text file in memory, cut after each "\n" so that the lines hold
    /// every byte, line ends included.
    void load_lines() {
        std::FILE* f = std::fopen(text_path.c_str(), "rb");
        if (f == nullptr) throw std::runtime_error("text file not readable");
        text.resize(fs::file_size(text_path));
        const std::size_t got = std::fread(text.data(), 1, text.size(), f);
        std::fclose(f);
        if (got != text.size()) throw std::runtime_error("text file not read");
        std::string_view rest = text;
        while (!rest.empty()) {
            const std::size_t end = rest.find('\n');
            const std::size_t length = end == std::string_view::npos ? rest.size() : end + 1;
            lines.push_back(rest.substr(0, length));
            rest.remove_prefix(length);
        }
    }

    bool write_text() { return vrx.vrx_write(text_path.c_str(), nullptr, 0) == VX_OK; }

    bool write_raw() {
        Port::Stream stream(Port::ACCESS_WRITE, kStreamBuffer);
        if (Port::File::open(raw_path.c_str(), &stream, false) == nullptr) return false;
        for (std::string_view line : lines)
            stream.write(line.data(), line.size());
        return Port::File::close(&stream);
    }

    /// The bare bytes through the writer's own file steps.
    bool write_raw_copied() {
        return write_raw() && Port::File::copy(raw_path.c_str(), raw_copy_path.c_str()) &&
               Port::File::remove(raw_path.c_str());
    }

    double megabytes() const { return double(text.size()) / 1e6; }

    TempFolder temp{"vrx-writer-bench"};
    std::string design_path;
    std::string text_path;
    std::string raw_path;
    std::string raw_copy_path;
    VRX vrx;
    std::string text;
    std::vector<std::string_view> lines;
};

std::unique_ptr<WriterFixture> the_fixture;
double raw_mb_per_s = 0;         // from BM_RawStream, or measured on demand
double raw_copied_mb_per_s = 0;  // from BM_RawStreamCopied

WriterFixture& fixture() {
    if (!the_fixture) the_fixture = std::make_unique<WriterFixture>();
    return *the_fixture;
}

/// Times `iterations` raw writes outside any benchmark; for the ratio when
/// BM_RawStream was filtered out.
double measure_raw(WriterFixture& f, int iterations) {
    double seconds = 0;
    for (int i = 0; i < iterations; ++i) {
        const auto start = std::chrono::steady_clock::now();
        if (!f.write_raw()) return 0;
        seconds += seconds_since(start);
    }
    return f.megabytes() * iterations / seconds;
}

/// Runs `write` once an iteration and reports its wall-clock MB/s, which it
/// returns; 0 after a failed write, which skips the benchmark.
template <class Write>
double timed_writes(benchmark::State& state, const WriterFixture& f, Write write,
                    const char* failure) {
    double seconds = 0;
    for (auto _ : state) {
        const auto start = std::chrono::steady_clock::now();
        const bool ok = write();
        seconds += seconds_since(start);
        if (!ok) {
            state.SkipWithError(failure);
            return 0;
        }
    }
    const double mb_per_s = f.megabytes() * double(state.iterations()) / seconds;
    state.SetBytesProcessed(int64_t(f.text.size()) * state.iterations());
    state.counters["MB/s"] = mb_per_s;
    state.counters["file_MB"] = f.megabytes();
    return mb_per_s;
}

void BM_RawStream(benchmark::State& state) {
    WriterFixture& f = fixture();
    raw_mb_per_s = timed_writes(
        state, f, [&] { return f.write_raw(); }, "raw stream not written");
    state.counters["lines"] = double(f.lines.size());
}
BENCHMARK(BM_RawStream)->Unit(benchmark::kMillisecond)->Iterations(3)->UseRealTime();

void BM_RawStreamCopied(benchmark::State& state) {
    WriterFixture& f = fixture();
    raw_copied_mb_per_s = timed_writes(
        state, f, [&] { return f.write_raw_copied(); }, "raw stream not written and copied");
}
BENCHMARK(BM_RawStreamCopied)->Unit(benchmark::kMillisecond)->Iterations(3)->UseRealTime();

void BM_WriteText(benchmark::State& state) {
    WriterFixture& f = fixture();
    const double mb_per_s = timed_writes(
        state, f, [&] { return f.write_text(); }, "text file not written");
    if (mb_per_s == 0) return;
    if (raw_mb_per_s == 0) raw_mb_per_s = measure_raw(f, 3);
    state.counters["ratio_to_raw"] = raw_mb_per_s > 0 ? mb_per_s / raw_mb_per_s : 0;
    if (raw_copied_mb_per_s > 0)
        state.counters["ratio_to_raw_copied"] = mb_per_s / raw_copied_mb_per_s;
}
BENCHMARK(BM_WriteText)->Unit(benchmark::kMillisecond)->Iterations(3)->UseRealTime();

}  // namespace

int main(int argc, char** argv) {
    show_only_errors();
    benchmark::Initialize(&argc, argv);
    int status = 0;
    try {
        benchmark::RunSpecifiedBenchmarks();
    } catch (const std::exception& e) {
        std::fprintf(stderr, "writer_bench: %s\n", e.what());
        status = 1;
    }
    the_fixture.reset();  // removes the folder and its files
    benchmark::Shutdown();
    return status;
}
