// The reader's speed: scanning and parsing with callbacks that do nothing, on
// a generated netlist of over 100 MB and on the real netlists. Each parse is
// set against a bare loop that only classifies every byte of the same buffer,
// timed in the same run ("classify_MB/s"); "ratio" is parse speed over it.
// For the detail, "scan_MB/s" is the scanner alone (tokens read and dropped,
// no parser) on the same input, and "bytes/token" the input's mean token size.
//
//   build/bin/reader_bench
//
// The netlists come from VRX_NETLISTS (default: ../shared/netlists beside the
// source tree); a netlist that is absent is skipped with a message. The
// generated file is written to a temporary directory and removed afterwards.
#include <benchmark/benchmark.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

#include "vrx_parser.h"
#include "vrx_scan.h"

namespace fs = std::filesystem;

// --- Callbacks that do nothing -------------------------------------------------

void vrx_do_library_props(VX_PROP_ARRAY*) {}
void vrx_begin_design(const char*, VX_PROP_ARRAY*) {}
void vrx_end_design() {}
void vrx_add_alias(const char*, const char*) {}
void vrx_begin_block(const char*, uint16_t, uint8_t, VX_PROP_ARRAY*) {}
void vrx_begin_prim(const char*, uint16_t, uint8_t, VX_PROP_ARRAY*) {}
void vrx_end_block() {}
void vrx_do_pin(const char*, VX_PROP_ARRAY*) {}
void vrx_do_signal(const char*, VX_SIGNAL_TYPE, VX_PROP_ARRAY*) {}
void vrx_do_mapsignal(const char*, const char*, VX_PROP_ARRAY*) {}
void vrx_add_mapconn(const char*, const char*, VX_PROP_ARRAY*) {}
void vrx_set_parser_status(VX_PARSER_STATUS) {}

namespace {

fs::path netlist_dir() {
    if (const char* dir = std::getenv("VRX_NETLISTS")) return dir;
    return VRX_DEFAULT_NETLISTS;
}

// The generated netlist: about 109 MB of the shape of the real ones.
class GeneratedNetlist {
  public:
    static const GeneratedNetlist& get() {
        static GeneratedNetlist netlist;
        return netlist;
    }
    const fs::path& path() const { return path_; }
    const std::string& error() const { return error_; }

  private:
    GeneratedNetlist() {
        const fs::path script = netlist_dir() / "gen_vrx.py";
        if (!fs::exists(script)) {
            error_ = "generator not found: " + script.string();
            return;
        }
        char pattern[] = "/tmp/vrx_reader_bench_XXXXXX";
        if (!mkdtemp(pattern)) {
            error_ = "no temporary directory";
            return;
        }
        dir_ = pattern;
        path_ = dir_ / "syn700000.vrx";
        const std::string command =
            "python3 '" + script.string() + "' --gates 700000 -o '" + path_.string() + "'";
        if (std::system(command.c_str()) != 0 || fs::file_size(path_) < 100'000'000) {
            error_ = "generating failed: " + command;
        }
    }
    ~GeneratedNetlist() {
        if (!dir_.empty()) fs::remove_all(dir_);
    }

    fs::path dir_;
    fs::path path_;
    std::string error_;
};

std::string read_all(const fs::path& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

// The reader's byte classes: blank, line end, quote, separator, digit, word, NUL.
constexpr std::array<unsigned char, 256> make_classes() {
    std::array<unsigned char, 256> classes{};
    for (unsigned char& c : classes)
        c = 5;
    classes[0] = 6;
    classes[' '] = classes['\t'] = 0;
    classes['\n'] = 1;
    classes['"'] = 2;
    for (unsigned char c : {'(', ')', '{', '}', '='})
        classes[c] = 3;
    for (unsigned char c = '0'; c <= '9'; ++c)
        classes[c] = 4;
    return classes;
}
constexpr std::array<unsigned char, 256> kClasses = make_classes();

// The bare loop: classify every byte, nothing else.
uint64_t classify(const std::string& text) {
    uint64_t sum = 0;
    for (const char c : text)
        sum += kClasses[static_cast<unsigned char>(c)];
    return sum;
}

double cpu_seconds() {
    timespec now{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
    return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

// The scanner alone: the number of tokens in `input`.
uint64_t scan_stream(std::FILE* input) {
    vrx_set_input(input);
    vrx_parse_init();
    uint64_t tokens = 0;
    while (vrx_next_token() != VX_TOK_END)
        ++tokens;
    vrx_set_input(nullptr);
    return tokens;
}

int32_t parse_stream(std::FILE* input) {
    vrx_set_input(input);
    vrx_parse_init();
    const int32_t result = vrx_parse();
    vrx_set_input(nullptr);
    return result;
}

// Parses `path` from the file system (page cache) or from memory; each parse is
// followed by one bare classifying pass over the same bytes. Both are timed in
// thread CPU time, so that a busy machine affects them alike.
void parse_netlist(benchmark::State& state, const fs::path& path, bool from_memory) {
    if (!fs::exists(path)) {
        state.SkipWithError(("netlist not found: " + path.string()).c_str());
        return;
    }
    std::string text = read_all(path);
    auto open_input = [&] {
        return from_memory ? fmemopen(text.data(), text.size(), "r")
                           : std::fopen(path.c_str(), "r");
    };
    double parse_time = 0;
    double classify_time = 0;
    double scan_time = 0;
    uint64_t tokens = 0;
    for (auto _ : state) {
        const double start = cpu_seconds();
        std::FILE* input = open_input();
        const int32_t result = parse_stream(input);
        std::fclose(input);
        const double parsed = cpu_seconds();
        benchmark::DoNotOptimize(classify(text));
        const double classified = cpu_seconds();
        if (result != 0) {
            state.SkipWithError("parse failed");
            return;
        }
        state.PauseTiming();
        const double scan_start = cpu_seconds();
        input = open_input();
        tokens = scan_stream(input);
        std::fclose(input);
        scan_time += cpu_seconds() - scan_start;
        state.ResumeTiming();
        state.SetIterationTime(parsed - start);
        parse_time += parsed - start;
        classify_time += classified - parsed;
    }
    const double bytes = static_cast<double>(text.size()) * static_cast<double>(state.iterations());
    state.SetBytesProcessed(static_cast<int64_t>(bytes));
    state.counters["MB"] = static_cast<double>(text.size()) / 1e6;
    state.counters["parse_MB/s"] = bytes / parse_time / 1e6;
    state.counters["classify_MB/s"] = bytes / classify_time / 1e6;
    state.counters["ratio"] = classify_time / parse_time;
    state.counters["scan_MB/s"] = bytes / scan_time / 1e6;
    state.counters["bytes/token"] = static_cast<double>(text.size()) / static_cast<double>(tokens);
}

void BM_Generated(benchmark::State& state, bool from_memory) {
    const GeneratedNetlist& netlist = GeneratedNetlist::get();
    if (!netlist.error().empty()) {
        state.SkipWithError(netlist.error().c_str());
        return;
    }
    parse_netlist(state, netlist.path(), from_memory);
}

void BM_Real(benchmark::State& state, const char* relative, bool from_memory) {
    parse_netlist(state, netlist_dir() / relative, from_memory);
}

BENCHMARK_CAPTURE(BM_Generated, syn700000_memory, true)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(BM_Generated, syn700000_file, false)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(BM_Real, biriscv_memory, "biriscv/biriscv.vrx", true)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(BM_Real, picorv32_memory, "picorv32/picorv32.vrx", true)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(BM_Real, serv_memory, "serv/serv.vrx", true)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(BM_Real, biriscv_file, "biriscv/biriscv.vrx", false)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);

}  // namespace
