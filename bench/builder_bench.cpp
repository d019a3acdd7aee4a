// Text netlists into the database and back: vrx_read (design mode) on
// generated and real netlists, vrx_write of what was read, the database
// files (hxb_write / hxb_read) against the text, and how read time grows with
// the size of a hierarchical netlist.
//
//   build/bin/builder_bench                       every table
//   build/bin/builder_bench --only hier1M,serv    some netlists (names as in the tables;
//                                                 "scaling" for the scaling table)
//   build/bin/builder_bench --no-memory --no-scaling --reps 1
//   build/bin/builder_bench --time FILE.vrx       one file: prims and prims/s (bench/peers.sh)
//   build/bin/builder_bench --tsv                 the figures as tab-separated lines
//                                                 (bench/run.sh; formats below, "--tsv")
//   build/bin/builder_bench --scale-max 400000    a shorter scaling series
//
// Netlists:
//   flat1M   gen_vrx.py --gates 1000000: one million AND gates, flat
//   hier1M   bench/gen_hier_vrx.py --prims 1000000: leaf, mid and top designs
//            with grafted instances, hierarchical signals with properties and
//            merge records, a physical hierarchy with map signals
//   EPFL circuits (aig2vrx.py), serv, biriscv, picorv32
//   scaling  gen_hier_vrx.py at 100k, 200k, 400k, 800k and 1.6M primitives
//            (--scale-max: up to that size)
// The real netlists and the two scripts come from VRX_NETLISTS (default:
// ../shared/netlists beside the source tree); without them those rows are
// skipped with a message. Generated files go to a fresh folder under $TMPDIR
// (or /tmp), removed at the end.
//
// Figures (each the best of --reps runs, default 3):
//   - every read, write and file read runs in a forked child that does that
//     one job, as a program that converts once would: no memory left over
//     from an earlier read to reuse, the pages of a fresh process to fault in;
//   - times are process CPU time (user + system) of the single-threaded
//     child, so that other work on a shared machine does not inflate them;
//     --wall uses wall-clock time instead;
//   - prims counts every primitive of the design read, grafted copies
//     included; pins every pin of its blocks and primitives; lib pins those
//     of every design the read built (the designs grafted into the last one
//     stay in the library);
//   - peak B/pin: peak resident memory of a child that only reads the
//     netlist, less that of a child that reads a netlist of one gate (code,
//     buffers and tables every read needs), over lib pins. This process
//     stays small, because a child starts with its parent's resident pages.
//     Small netlists show a higher figure: the first chunks of each kind of
//     object weigh on few pins.
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <exception>
#include <filesystem>
#include <limits>
#include <stdexcept>
#include <string>
#include <vector>

#include "and_design.h"
#include "hx_library.h"
#include "temp_folder.h"
#include "vrx.h"

namespace {

namespace fs = std::filesystem;

// --- Options ------------------------------------------------------------------------

struct Options {
    int reps = 3;
    bool wall = false;
    bool memory = true;
    bool scaling = true;
    bool tsv = false;
    long scale_max = 1'600'000;     // the largest netlist of the scaling series
    std::vector<std::string> only;  // netlist names; empty: all
    std::string time_file;          // --time
};

bool selected(const Options& options, const std::string& name) {
    return options.only.empty() ||
           std::find(options.only.begin(), options.only.end(), name) != options.only.end();
}

std::vector<std::string> split_commas(const std::string& text) {
    std::vector<std::string> parts;
    std::size_t start = 0;
    while (start <= text.size()) {
        const std::size_t end = std::min(text.find(',', start), text.size());
        if (end > start) parts.push_back(text.substr(start, end - start));
        start = end + 1;
    }
    return parts;
}

void usage() {
    std::fprintf(stderr,
                 "usage: builder_bench [--reps N] [--wall] [--no-memory] [--no-scaling]\n"
                 "                     [--scale-max PRIMS] [--only NAME,...] [--tsv]\n"
                 "                     [--time FILE.vrx]\n");
    std::exit(64);
}

Options parse_options(int argc, char** argv) {
    Options options;
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        const bool has_value = i + 1 < argc;
        if (arg == "--reps" && has_value) {
            options.reps = std::max(1, std::atoi(argv[++i]));
        } else if (arg == "--wall") {
            options.wall = true;
        } else if (arg == "--no-memory") {
            options.memory = false;
        } else if (arg == "--no-scaling") {
            options.scaling = false;
        } else if (arg == "--tsv") {
            options.tsv = true;
        } else if (arg == "--scale-max" && has_value) {
            options.scale_max = std::max(100'000L, std::atol(argv[++i]));
        } else if (arg == "--only" && has_value) {
            options.only = split_commas(argv[++i]);
        } else if (arg == "--time" && has_value) {
            options.time_file = argv[++i];
        } else {
            usage();
        }
    }
    if (!options.only.empty()) options.scaling = options.scaling && selected(options, "scaling");
    return options;
}

// --- Clocks -------------------------------------------------------------------------

struct Instant {
    double cpu;
    double wall;
};

Instant now() {
    timespec cpu{};
    timespec wall{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &cpu);
    clock_gettime(CLOCK_MONOTONIC, &wall);
    return {double(cpu.tv_sec) + double(cpu.tv_nsec) * 1e-9,
            double(wall.tv_sec) + double(wall.tv_nsec) * 1e-9};
}

bool use_wall = false;

double elapsed(const Instant& start) {
    const Instant end = now();
    return use_wall ? end.wall - start.wall : end.cpu - start.cpu;
}

/// The best of several timed runs.
struct Best {
    double seconds = std::numeric_limits<double>::infinity();

    void add(const Instant& start) { seconds = std::min(seconds, elapsed(start)); }
};

// --- Files and folders --------------------------------------------------------------

fs::path netlist_dir() {
    if (const char* dir = std::getenv("VRX_NETLISTS")) return dir;
    return VRX_DEFAULT_NETLISTS;
}

double megabytes(const fs::path& path) {
    std::error_code error;
    const auto size = fs::file_size(path, error);
    return error ? 0.0 : double(size) / 1e6;
}

/// Runs a python script; false (with a message) when it fails.
bool run_python(const fs::path& script, const std::string& arguments) {
    const std::string command = "python3 '" + script.string() + "' " + arguments;
    if (std::system(command.c_str()) == 0) return true;
    std::fprintf(stderr, "builder_bench: failed: %s\n", command.c_str());
    return false;
}

// --- Netlists -----------------------------------------------------------------------

struct Netlist {
    std::string name;
    fs::path path;  // empty when not available
};

const char* const kEpflCircuits[] = {"hyp", "mem_ctrl", "div", "log2", "multiplier", "sqrt"};
const char* const kCores[][2] = {{"serv", "serv/serv.vrx"},
                                 {"biriscv", "biriscv/biriscv.vrx"},
                                 {"picorv32", "picorv32/picorv32.vrx"}};

/// Makes (or finds) every selected netlist; a missing one is reported once
/// and left out.
std::vector<Netlist> prepare_netlists(const Options& options, const fs::path& temp) {
    const fs::path shared = netlist_dir();
    const bool have_shared = fs::exists(shared / "gen_vrx.py");
    if (!have_shared) {
        std::printf(
            "netlists not found in %s (set VRX_NETLISTS): flat1M, EPFL and the cores "
            "are skipped\n",
            shared.c_str());
    }
    std::vector<Netlist> netlists;
    auto add_generated = [&](const std::string& name, const fs::path& script,
                             const std::string& arguments) {
        if (!selected(options, name)) return;
        const fs::path out = temp / (name + ".vrx");
        std::fprintf(stderr, "generating %s ...\n", name.c_str());
        if (run_python(script, arguments + " -o '" + out.string() + "'"))
            netlists.push_back({name, out});
    };
    if (have_shared) add_generated("flat1M", shared / "gen_vrx.py", "--gates 1000000");
    add_generated("hier1M", fs::path(VRX_BENCH_DIR) / "gen_hier_vrx.py", "--prims 1000000");
    if (!have_shared) return netlists;
    for (const char* circuit : kEpflCircuits) {
        const fs::path aig = shared / "epfl" / (std::string(circuit) + ".aig");
        if (fs::exists(aig)) {
            add_generated(circuit, shared / "aig2vrx.py", "'" + aig.string() + "'");
        } else if (selected(options, circuit)) {
            std::printf("%s: not found, skipped\n", aig.c_str());
        }
    }
    for (const auto& core : kCores) {
        if (!selected(options, core[0])) continue;
        if (fs::exists(shared / core[1])) {
            netlists.push_back({core[0], shared / core[1]});
        } else {
            std::printf("%s: not found, skipped\n", (shared / core[1]).c_str());
        }
    }
    return netlists;
}

// --- Reading ------------------------------------------------------------------------

struct Counts {
    std::size_t prims = 0;     // of the design read, grafted copies included
    std::size_t pins = 0;      // of the design read
    std::size_t lib_pins = 0;  // of every design the read built
};

void count_design(const HX_DESIGN* design, std::size_t* prims, std::size_t& pins) {
    UT_BLIST_ITER<HX_BLOCK>* iter = design->create_block_iter();
    while (HX_BLOCK* block = iter->l_next()) {
        if (prims != nullptr && block->is_primitive()) ++*prims;
        pins += block->get_pin_count();
    }
    design->delete_block_iter(iter);
}

/// What the converter read: its design, and the whole library behind it
/// (the designs that were grafted into it stay there).
Counts count(const VRX& vrx) {
    Counts counts;
    if (vrx.get_design() == nullptr) return counts;
    count_design(vrx.get_design(), &counts.prims, counts.pins);
    const HX_LIBRARY* library = vrx.get_library();
    if (library == nullptr) return counts;
    UT_BLIST_ITER<HX_LIBLINK>* iter = library->create_liblink_iter();
    while (HX_LIBLINK* link = iter->l_next())
        count_design(link->get_design(), nullptr, counts.lib_pins);
    library->delete_liblink_iter(iter);
    return counts;
}

bool read_ok(int32_t status) {
    return status == VX_OK || status == VX_DRC_ERROR;  // a DRC finding still reads whole
}

const char* status_text(int32_t status) {
    switch (status) {
        case VX_OK:
            return "ok";
        case VX_DRC_ERROR:
            return "DRC errors";
        case VX_PARSE_ERROR:
            return "parse error";
        case VX_FILE_ERROR:
            return "file error";
        default:
            return "no result";
    }
}

// --- Children -----------------------------------------------------------------------
//
// Every figure comes from a forked child that does one job and reports it
// through a pipe; this process stays small. A child times a read twice:
// cold, as the first thing it does, like a program that converts once (every
// page of the result is new to the process), and warm, once more after
// freeing the first result, like a host that converts file after file (some
// of the memory is at hand by then). The first touch of memory costs much on
// some machines, virtual ones above all, which the difference shows.

/// Two timings of one step: in a fresh process and in a warmed-up one.
struct Times {
    double cold = 0;
    double warm = 0;
};

/// What a child reports.
struct Report {
    int32_t status = -1;  // VX_STATUS of the job; -1 when the child reported nothing
    Times read;           // vrx_read or hxb_read
    double text_write = 0;
    double db_write = 0;
    Counts counts;
    long peak_rss = 0;  // bytes, after the cold read
};

/// Runs `job(report)` in a child process and returns its report.
template <class Job>
Report in_child(Job job) {
    int fds[2];
    if (::pipe(fds) != 0) throw std::runtime_error("pipe failed");
    std::fflush(nullptr);
    const pid_t pid = fork();
    if (pid == 0) {
        ::close(fds[0]);
        Report report;
        job(report);
        const bool sent = ::write(fds[1], &report, sizeof report) == sizeof report;
        _exit(sent ? 0 : 1);
    }
    ::close(fds[1]);
    Report report;
    if (pid < 0 || ::read(fds[0], &report, sizeof report) != sizeof report) report = Report{};
    ::close(fds[0]);
    int status = 0;
    if (pid > 0) waitpid(pid, &status, 0);
    return report;
}

long peak_rss_now() {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss * 1024L;
}

/// One timed vrx_read into `seconds`; the library is freed afterwards.
template <class After>
int32_t timed_read(const fs::path& path, double& seconds, After after) {
    HX_LIBRARY* library = nullptr;
    int32_t status = -1;
    {
        VRX vrx;
        const Instant start = now();
        status = vrx.vrx_read(path.c_str(), 1, 0, 0);
        seconds = elapsed(start);
        library = vrx.get_library();
        if (read_ok(status)) after(vrx);
    }
    if (library != nullptr) hx_env.delete_library(library);
    return status;
}

/// Child job: vrx_read of `path`, cold and warm; the peak memory of the cold
/// read and the counts of what it built.
void read_job(const fs::path& path, Report& report) {
    report.status = timed_read(path, report.read.cold, [&](const VRX& vrx) {
        report.peak_rss = peak_rss_now();  // before counting, which takes memory too
        report.counts = count(vrx);
    });
    if (read_ok(report.status)) timed_read(path, report.read.warm, [](const VRX&) {});
}

/// Child job: hxb_read of `db_file`, cold and warm.
void db_read_job(const fs::path& db_file, Report& report) {
    for (double* seconds : {&report.read.cold, &report.read.warm}) {
        HX_DESIGN* loaded = nullptr;
        {
            VRX vrx;
            const Instant start = now();
            report.status = vrx.hxb_read(db_file.c_str());
            *seconds = elapsed(start);
            loaded = vrx.get_design();
        }
        if (report.status != VX_OK) return;
        if (loaded != nullptr) hx_env.delete_library(loaded->get_library());
    }
}

/// Child job: vrx_read of `path` (untimed), then `reps` timed vrx_write and
/// hxb_write of the result, the best of each; leaves both files behind.
void write_job(const fs::path& path, const fs::path& text_out, const fs::path& db_out, int reps,
               Report& report) {
    VRX vrx;
    report.status = vrx.vrx_read(path.c_str(), 1, 0, 0);
    if (!read_ok(report.status)) return;
    report.status = VX_OK;
    Best text;
    Best db;
    for (int i = 0; i < reps && report.status == VX_OK; ++i) {
        Instant start = now();
        if (vrx.vrx_write(text_out.c_str(), nullptr, 0) != VX_OK) report.status = VX_FILE_ERROR;
        text.add(start);
        start = now();
        if (vrx.hxb_write(db_out.c_str()) != VX_OK) report.status = VX_FILE_ERROR;
        db.add(start);
    }
    report.text_write = text.seconds;
    report.db_write = db.seconds;
}

/// `reps` runs of a read job in children: the best cold and warm times, the
/// counts, the least peak memory.
template <class Job>
Report best_of_children(int reps, Job job) {
    Report best;
    for (int i = 0; i < reps; ++i) {
        const Report r = in_child(job);
        if (r.status < 0 || (r.status != VX_OK && r.status != VX_DRC_ERROR)) return r;
        if (best.status < 0) {
            best = r;
            continue;
        }
        best.read.cold = std::min(best.read.cold, r.read.cold);
        best.read.warm = std::min(best.read.warm, r.read.warm);
        best.peak_rss = std::min(best.peak_rss, r.peak_rss);
    }
    return best;
}

Report best_read(const fs::path& path, int reps) {
    return best_of_children(reps, [&](Report& report) { read_job(path, report); });
}

/// A netlist of one gate. Its read is the baseline of the memory figures, so
/// that the code, buffers and tables that every read brings in count there,
/// not as memory per pin.
fs::path write_tiny_netlist(const fs::path& folder) {
    const fs::path path = folder / "tiny.vrx";
    std::FILE* f = std::fopen(path.c_str(), "w");
    if (f == nullptr) throw std::runtime_error("cannot write " + path.string());
    std::fputs(
        "DESIGN tiny {\n   BLOCK tiny 3 {\n      PIN a (TYPE=IN CONN=a)\n"
        "      PIN b (TYPE=IN CONN=b)\n      PIN y (TYPE=OUT CONN=y)\n   }\n"
        "   PRIM AND 2 {\n      PIN IN (CONN=a)\n      PIN IN (CONN=b)\n"
        "      PIN OUT (CONN=y)\n   }\n}\n",
        f);
    std::fclose(f);
    return path;
}

// --- Measuring one netlist ----------------------------------------------------------

struct Result {
    std::string name;
    double text_mb = 0;
    Report read;
    Report write;
    Report db_read;
    double written_mb = 0;
    double db_mb = 0;
};

Result measure(const Netlist& netlist, const Options& options, const fs::path& temp) {
    Result result;
    result.name = netlist.name;
    result.text_mb = megabytes(netlist.path);
    std::fprintf(stderr, "reading %s ...\n", netlist.name.c_str());
    result.read = best_read(netlist.path, options.reps);
    if (!read_ok(result.read.status)) return result;

    const fs::path text_out = temp / (netlist.name + ".out.vrx");
    const fs::path db_out = temp / (netlist.name + ".hxb");
    result.write = in_child(
        [&](Report& report) { write_job(netlist.path, text_out, db_out, options.reps, report); });
    result.written_mb = megabytes(text_out);
    result.db_mb = megabytes(db_out);
    if (result.write.status == VX_OK) {
        result.db_read =
            best_of_children(options.reps, [&](Report& report) { db_read_job(db_out, report); });
    }
    std::error_code ignored;
    fs::remove(text_out, ignored);
    fs::remove(db_out, ignored);
    return result;
}

// --- Tables -------------------------------------------------------------------------

const char* verdict(bool met) {
    return met ? "ok" : "MISSED";
}

void print_header(const Options& options) {
    std::printf(
        "builder_bench: best of %d runs, each in a fresh child process; %s.\n"
        "cold: the first read of a process; warm: a second read in the same process, after\n"
        "the first one's result was freed\n",
        options.reps,
        options.wall ? "wall-clock time" : "process CPU time (user + system; --wall: wall-clock)");
}

void print_read_table(const std::vector<Result>& results, long baseline) {
    std::printf(
        "\nReading text into the database (vrx_read, design mode); target: peak <= 150 B/pin\n"
        "(prims, pins: of the design read; lib pins: of every design the read built, those\n"
        "grafted into it included; peak B/pin over lib pins, less a one-gate read's %.1f MB)\n",
        double(baseline) / 1e6);
    std::printf("%-10s %7s %8s %8s %8s | %7s %6s %8s | %7s %6s %8s | %8s %-6s %s\n", "", "text", "",
                "", "lib", "cold", "", "", "warm", "", "", "peak", "", "");
    std::printf("%-10s %7s %8s %8s %8s | %7s %6s %8s | %7s %6s %8s | %8s %-6s %s\n", "netlist",
                "MB", "prims", "pins", "pins", "read s", "MB/s", "Mprims/s", "read s", "MB/s",
                "Mprims/s", "B/pin", "", "status");
    for (const Result& r : results) {
        if (!read_ok(r.read.status)) {
            std::printf("%-10s %7.1f  read failed: %s\n", r.name.c_str(), r.text_mb,
                        status_text(r.read.status));
            continue;
        }
        const Counts& counts = r.read.counts;
        const Times& t = r.read.read;
        char peak[32] = "-";
        const char* met = "";
        if (baseline > 0 && counts.lib_pins > 0) {
            const double per_pin = double(r.read.peak_rss - baseline) / double(counts.lib_pins);
            std::snprintf(peak, sizeof peak, "%.1f", per_pin);
            met = verdict(per_pin <= 150);
        }
        std::printf(
            "%-10s %7.1f %8zu %8zu %8zu | %7.3f %6.1f %8.2f | %7.3f %6.1f %8.2f | %8s %-6s %s\n",
            r.name.c_str(), r.text_mb, counts.prims, counts.pins, counts.lib_pins, t.cold,
            r.text_mb / t.cold, double(counts.prims) / t.cold / 1e6, t.warm, r.text_mb / t.warm,
            double(counts.prims) / t.warm / 1e6, peak, met, status_text(r.read.status));
    }
}

void print_write_table(const std::vector<Result>& results) {
    std::printf(
        "\nWriting the design back as text (vrx_write, after a read in the same process)\n");
    std::printf("%-10s %10s %8s %8s\n", "netlist", "written MB", "write s", "MB/s");
    for (const Result& r : results) {
        if (r.write.status != VX_OK) continue;
        std::printf("%-10s %10.1f %8.3f %8.1f\n", r.name.c_str(), r.written_mb, r.write.text_write,
                    r.written_mb / r.write.text_write);
    }
}

void print_file_table(const std::vector<Result>& results) {
    std::printf(
        "\nDatabase file against text: times faster (text time / file time); target >= 5\n");
    std::printf("%-10s %6s | %9s %9s %6s %-6s | %9s %9s %6s %-6s | %9s %9s %6s %s\n", "", "",
                "cold", "", "", "", "warm", "", "", "", "", "", "", "");
    std::printf("%-10s %6s | %9s %9s %6s %-6s | %9s %9s %6s %-6s | %9s %9s %6s %s\n", "netlist",
                "hxb MB", "hxb_read", "vrx_read", "faster", "", "hxb_read", "vrx_read", "faster",
                "", "hxb_write", "vrx_write", "faster", "");
    for (const Result& r : results) {
        if (r.write.status != VX_OK || r.db_read.status != VX_OK) continue;
        const Times& db = r.db_read.read;
        const Times& text = r.read.read;
        const double cold = text.cold / db.cold;
        const double warm = text.warm / db.warm;
        const double write = r.write.text_write / r.write.db_write;
        std::printf(
            "%-10s %6.1f | %9.3f %9.3f %6.1f %-6s | %9.3f %9.3f %6.1f %-6s | %9.3f %9.3f %6.1f "
            "%s\n",
            r.name.c_str(), r.db_mb, db.cold, text.cold, cold, verdict(cold >= 5), db.warm,
            text.warm, warm, verdict(warm >= 5), r.write.db_write, r.write.text_write, write,
            verdict(write >= 5));
    }
}

// --- Scaling ------------------------------------------------------------------------

struct ScalePoint {
    long prims_asked = 0;
    double text_mb = 0;
    Report read;
};

std::vector<ScalePoint> measure_scaling(const Options& options, const fs::path& temp) {
    std::vector<ScalePoint> points;
    const fs::path script = fs::path(VRX_BENCH_DIR) / "gen_hier_vrx.py";
    for (long prims = 100'000; prims <= options.scale_max; prims *= 2) {
        ScalePoint point;
        point.prims_asked = prims;
        const fs::path file = temp / ("hier" + std::to_string(prims) + ".vrx");
        std::fprintf(stderr, "scaling: %ld primitives ...\n", prims);
        if (!run_python(script, "--prims " + std::to_string(prims) + " -o '" + file.string() + "'"))
            break;
        point.text_mb = megabytes(file);
        point.read = best_read(file, options.reps);
        std::error_code ignored;
        fs::remove(file, ignored);
        points.push_back(point);
        if (!read_ok(point.read.status)) break;
    }
    return points;
}

/// The mean ratio per doubling from the first size to the last, which single
/// doublings scatter around by a tenth or two on a busy machine.
void print_overall_ratio(const std::vector<ScalePoint>& points) {
    if (points.size() < 2 || !read_ok(points.back().read.status)) return;
    const ScalePoint& first = points.front();
    const ScalePoint& last = points.back();
    const double doublings = std::log2(double(last.read.counts.prims) / first.read.counts.prims);
    const double cold = std::pow(last.read.read.cold / first.read.read.cold, 1 / doublings);
    const double warm = std::pow(last.read.read.warm / first.read.read.warm, 1 / doublings);
    std::printf("mean ratio per doubling, %zu to %zu prims: cold %.2f %s, warm %.2f %s\n",
                first.read.counts.prims, last.read.counts.prims, cold, verdict(cold <= 2.3), warm,
                verdict(warm <= 2.3));
}

void print_scaling_table(const std::vector<ScalePoint>& points) {
    std::printf(
        "\nScaling: vrx_read of gen_hier_vrx.py netlists; target: ratio per doubling <= 2.3\n");
    std::printf("%9s %9s %8s | %7s %8s %6s %-6s | %7s %8s %6s %s\n", "", "", "", "cold", "", "", "",
                "warm", "", "", "");
    std::printf("%9s %9s %8s | %7s %8s %6s %-6s | %7s %8s %6s %s\n", "prims", "pins", "text MB",
                "read s", "Mprims/s", "ratio", "", "read s", "Mprims/s", "ratio", "");
    const ScalePoint* previous = nullptr;
    for (const ScalePoint& p : points) {
        if (!read_ok(p.read.status)) {
            std::printf("%9ld  read failed: %s\n", p.prims_asked, status_text(p.read.status));
            break;
        }
        const Counts& counts = p.read.counts;
        const Times& t = p.read.read;
        std::printf("%9zu %9zu %8.1f | %7.3f %8.2f", counts.prims, counts.pins, p.text_mb, t.cold,
                    double(counts.prims) / t.cold / 1e6);
        if (previous != nullptr) {
            const double ratio = t.cold / previous->read.read.cold;
            std::printf(" %6.2f %-6s", ratio, verdict(ratio <= 2.3));
        } else {
            std::printf(" %6s %-6s", "", "");
        }
        std::printf(" | %7.3f %8.2f", t.warm, double(counts.prims) / t.warm / 1e6);
        if (previous != nullptr) {
            const double ratio = t.warm / previous->read.read.warm;
            std::printf(" %6.2f %s", ratio, verdict(ratio <= 2.3));
        }
        std::printf("\n");
        previous = &p;
    }
    print_overall_ratio(points);
}

// --- Tab-separated figures (--tsv) -------------------------------------------------
//
// One line per netlist and kind, the raw measurements only (ratios are left
// to the caller); "-" where a figure is missing:
//   read   NAME text_MB prims pins lib_pins cold_s warm_s peak_B/pin status
//   write  NAME written_MB vrx_write_s
//   files  NAME hxb_MB hxb_read_cold_s hxb_read_warm_s hxb_write_s
//   scale  PRIMS pins text_MB cold_s warm_s status

void print_tsv_reads(const std::vector<Result>& results, long baseline) {
    for (const Result& r : results) {
        const Counts& counts = r.read.counts;
        const Times& t = r.read.read;
        if (!read_ok(r.read.status)) {
            std::printf("read\t%s\t%.3f\t-\t-\t-\t-\t-\t-\t%s\n", r.name.c_str(), r.text_mb,
                        status_text(r.read.status));
            continue;
        }
        char peak[32] = "-";
        if (baseline > 0 && counts.lib_pins > 0) {
            std::snprintf(peak, sizeof peak, "%.2f",
                          double(r.read.peak_rss - baseline) / double(counts.lib_pins));
        }
        std::printf("read\t%s\t%.3f\t%zu\t%zu\t%zu\t%.6f\t%.6f\t%s\t%s\n", r.name.c_str(),
                    r.text_mb, counts.prims, counts.pins, counts.lib_pins, t.cold, t.warm, peak,
                    status_text(r.read.status));
    }
}

void print_tsv_writes(const std::vector<Result>& results) {
    for (const Result& r : results) {
        if (r.write.status != VX_OK) continue;
        std::printf("write\t%s\t%.3f\t%.6f\n", r.name.c_str(), r.written_mb, r.write.text_write);
        if (r.db_read.status != VX_OK) continue;
        std::printf("files\t%s\t%.3f\t%.6f\t%.6f\t%.6f\n", r.name.c_str(), r.db_mb,
                    r.db_read.read.cold, r.db_read.read.warm, r.write.db_write);
    }
}

void print_tsv_scaling(const std::vector<ScalePoint>& points) {
    for (const ScalePoint& p : points) {
        if (!read_ok(p.read.status)) {
            std::printf("scale\t%ld\t-\t%.3f\t-\t-\t%s\n", p.prims_asked, p.text_mb,
                        status_text(p.read.status));
            continue;
        }
        std::printf("scale\t%zu\t%zu\t%.3f\t%.6f\t%.6f\t%s\n", p.read.counts.prims,
                    p.read.counts.pins, p.text_mb, p.read.read.cold, p.read.read.warm,
                    status_text(p.read.status));
    }
}

// --- Modes --------------------------------------------------------------------------

/// --time FILE: one line for bench/peers.sh (seconds: the cold read).
int time_one_file(const Options& options) {
    const fs::path path = options.time_file;
    const Report best = best_read(path, options.reps);
    if (!read_ok(best.status)) {
        std::fprintf(stderr, "builder_bench: %s: %s\n", path.c_str(), status_text(best.status));
        return 1;
    }
    const Times& t = best.read;
    std::printf(
        "prims=%zu pins=%zu seconds=%.6f warm_seconds=%.6f prims_per_s=%.0f MB_per_s=%.1f\n",
        best.counts.prims, best.counts.pins, t.cold, t.warm, double(best.counts.prims) / t.cold,
        megabytes(path) / t.cold);
    return 0;
}

int run_all(const Options& options) {
    TempFolder temp("vrx-builder-bench");
    const std::vector<Netlist> netlists = prepare_netlists(options, temp.path);
    long baseline = 0;
    if (options.memory) {
        const Report tiny = best_read(write_tiny_netlist(temp.path), options.reps);
        if (read_ok(tiny.status)) baseline = tiny.peak_rss;
    }
    std::vector<Result> results;
    for (const Netlist& netlist : netlists)
        results.push_back(measure(netlist, options, temp.path));
    const std::vector<ScalePoint> points =
        options.scaling ? measure_scaling(options, temp.path) : std::vector<ScalePoint>{};
    if (options.tsv) {
        print_tsv_reads(results, options.memory ? baseline : 0);
        print_tsv_writes(results);
        print_tsv_scaling(points);
        return 0;
    }
    print_header(options);
    print_read_table(results, options.memory ? baseline : 0);
    print_write_table(results);
    print_file_table(results);
    if (options.scaling) print_scaling_table(points);
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    const Options options = parse_options(argc, argv);
    use_wall = options.wall;
    show_only_errors();
    try {
        return options.time_file.empty() ? run_all(options) : time_one_file(options);
    } catch (const std::exception& e) {
        std::fprintf(stderr, "builder_bench: %s\n", e.what());
        return 1;
    }
}
