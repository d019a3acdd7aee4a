// Round trips between the netlist database and text netlists.
//
// Text to database to text is stable after one pass: a text T0 read and
// written gives T1, T1 read and written gives T2, and T1 and T2 are the same
// bytes apart from the time stamp on the first line. Checked on texts written from random designs
// and libraries, on the example design, and on the real netlists of the shared netlists folder
// (VRX_NETLISTS overrides where that is): the EPFL circuits, converted at test time with its
// aig2vrx.py, and three processor cores read as designs (the last design is the top).
//
// Database to text to database gives an equal design, for every design the
// text format can express (vrx_test::RandomDesignOptions::text_expressible
// makes only such designs; the comparison pairs objects by their place in
// the hierarchy, as vrx_test::CompareOptions::structural describes). What
// text cannot express, found in the writer and reader and by experiment:
// - names: absent or empty ones (written as "OBJ_$<number>", which reads
//   back as that name), a double quote in a name, names beyond 1022 bytes;
//   duplicate names among a block's pins, among siblings or among a block's
//   signals (text joins objects by name);
// - a block with children becomes a DESIGN of its own, named by its
//   hierarchical name: in a library these must not clash, and a library read
//   back holds those designs beside the original ones;
// - signals of blocks without children (such blocks have no section), signals
//   that no pin names and that carry no network property, global signals on
//   the outer side of root pins, merged signals;
// - USER values other than 1, USER on physical blocks; primitive pin
//   directions other than the role's own; primitives of width 1;
// - empty map-signal names; map inversion except on pins of map connections; map
//   connections to a logical block placed in another physical block;
// - properties whose kind their name and value do not give back on reading
//   (an integer under a free name reads back as a string, an empty string as
//   a flag, a string starting with '@' as a parameter), integers of
//   INT32_MIN, floats that "%f" rounds, timing values and pin references off
//   the pins of child blocks, object references, properties of root blocks
//   and root pins, signal properties other than SIG_ALIAS, USER_ALIAS and
//   RECOVERED_NAME (the rest belongs to the network), names that the reader
//   takes for itself (NAME, TYPE, CONN, ...);
// - a library's name (taken from the file name);
// - global signals that no child pin carries;
// - a pin reference anywhere but last among its pin's properties (the reader
//   attaches it once all pins of the block are named);
// - creation orders (of a block's signals, of connections, of networks): the
//   reader makes objects in the order the text names them, so that of
//   several signals equally high in a network another may be the highest
//   and name the network.
// And text to database to text: a library read from text holds a design per
// block with children beside the design that holds the block; written again,
// such a design appears only as the section it came from.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "design_compare.h"
#include "hx_library.h"
#include "msg_capture.h"
#include "port_file.h"
#include "random_design.h"
#include "scratch_dir.h"
#include "ut_ptrfile.h"
#include "vrx.h"

#if defined(__SANITIZE_ADDRESS__)
#define VRX_SANITIZED 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(undefined_behavior_sanitizer)
#define VRX_SANITIZED 1
#endif
#endif
#ifndef VRX_SANITIZED
#define VRX_SANITIZED 0
#endif

namespace {

namespace fs = std::filesystem;

// Largest text (bytes) read under the sanitizers, which slow reading and
// writing down several times over.
constexpr std::uintmax_t kSanitizedTextLimit = 6'000'000;

// The module that the design-rule check reports under.
constexpr const char* kDrcModule = "Hxb";

std::string netlists_dir() {
    const char* from_env = std::getenv("VRX_NETLISTS");
    return from_env != nullptr && *from_env != '\0' ? from_env : VRX_DEFAULT_NETLISTS;
}

/// Reports that are not status lines, joined; the first few only.
std::string reports(const MsgCapture& capture) {
    std::string out;
    int shown = 0;
    for (const CapturedMsg& m : capture.messages()) {
        if (m.level == PORT_MSG_STATUS) continue;
        if (++shown > 5) return out + "...\n";
        out += m.text;
    }
    return out;
}

/// The text without its time stamp line, so that texts of two runs compare.
std::string normalised(const std::string& text) {
    const std::size_t start = text.find("// Created ");
    return start == std::string::npos ? text : text.substr(text.find('\n', start) + 1);
}

/// Where two texts first differ, with the lines around it.
std::string first_difference(const std::string& a, const std::string& b) {
    std::size_t at = 0;
    while (at < a.size() && at < b.size() && a[at] == b[at])
        ++at;
    const std::size_t from = at < 200 ? 0 : at - 200;
    return "at byte " + std::to_string(at) + ":\n--- first\n" + a.substr(from, 400) +
           "\n--- second\n" + b.substr(from, 400);
}

/// Reads the text `in` and writes it as the text `out`; the library read is
/// deleted afterwards. False, with a test failure, when a step fails.
bool text_pass(const std::string& in, const std::string& out, bool is_design) {
    MsgCapture capture;
    HX_LIBRARY* library = nullptr;
    VX_STATUS read = VX_OK;
    VX_STATUS written = VX_OK;
    {
        VRX vrx;
        read = vrx.vrx_read(in.c_str(), is_design ? 1 : 0, 0, 0);
        library = vrx.get_library();
        if (read == VX_OK || read == VX_DRC_ERROR)  // design-rule errors: complete all the same
            written = vrx.vrx_write(out.c_str(), nullptr, 0);
    }
    if (library != nullptr) hx_env.delete_library(library);
    EXPECT_TRUE(read == VX_OK || read == VX_DRC_ERROR) << in << ": " << reports(capture);
    EXPECT_EQ(written, VX_OK) << out << ": " << reports(capture);
    EXPECT_TRUE(capture.exits().empty()) << reports(capture);
    return (read == VX_OK || read == VX_DRC_ERROR) && written == VX_OK;
}

/// T0 -> T1 -> T2 in `dir`; T1 and T2 must agree.
void expect_stable(const std::string& t0, const ScratchDir& dir, bool is_design) {
    const std::string t1 = dir.file("t1.vrx");
    const std::string t2 = dir.file("t2.vrx");
    if (!text_pass(t0, t1, is_design) || !text_pass(t1, t2, is_design)) return;
    const std::string first = normalised(ScratchDir::read_file(t1));
    const std::string second = normalised(ScratchDir::read_file(t2));
    EXPECT_TRUE(first == second) << t0 << " " << first_difference(first, second);
}

/// Stores a design (`library` null) or a library as a database file.
bool store(const std::string& path, HX_DESIGN* design, HX_LIBRARY* library) {
    UT_PTRFILE file(Port::ACCESS_WRITE);
    bool written = Port::File::open(path.c_str(), &file, false) != nullptr &&
                   (library != nullptr ? hx_env.write_library(&file, library)
                                       : hx_env.write_design(&file, design));
    written = Port::File::close(&file) && written;
    EXPECT_TRUE(written) << path;
    return written;
}

/// Writes the database file `db` as the text `text`.
bool database_to_text(const std::string& db, const std::string& text) {
    MsgCapture capture;
    VRX vrx;
    const bool done =
        vrx.hxb_read(db.c_str()) == VX_OK && vrx.vrx_write(text.c_str(), nullptr, 0) == VX_OK;
    EXPECT_TRUE(done) << db << ": " << reports(capture);
    return done;
}

vrx_test::RandomDesignOptions expressible() {
    vrx_test::RandomDesignOptions options;
    options.text_expressible = true;
    return options;
}

// --- Text -> database -> text ---------------------------------------------------

TEST(TextRoundTrip, RandomDesignsAndLibrariesAreStableAfterOnePass) {
    // Other random designs hold values that do not read back at all (the
    // reader refuses a timing on a block, an integer of INT32_MIN, ...).
    // Read as libraries, hierarchical ones check that the designs made from
    // sections are written once, as the sections they came from.
    for (const bool flat : {false, true}) {
        vrx_test::RandomDesignOptions options = expressible();
        options.flat = flat;
        for (uint64_t seed = 1; seed <= 12; ++seed) {
            SCOPED_TRACE("seed " + std::to_string(seed) + (flat ? ", flat" : ""));
            ScratchDir dir;
            HX_LIBRARY* library = vrx_test::make_random_library(hx_env, seed, 3, options);
            const std::string hxl = dir.file("lib.hxl");
            const std::string t0 = dir.file("lib.vrx");
            const bool ready = store(hxl, nullptr, library) && database_to_text(hxl, t0);
            hx_env.delete_library(library);
            if (!ready) continue;
            expect_stable(t0, dir, true);  // the last design
            expect_stable(t0, dir, false);
        }
    }
}

TEST(TextRoundTrip, ExampleDesignIsStable) {
    ScratchDir dir;
    const std::string hxb = dir.file("counter.hxb");
    const std::string command = std::string("'") + MAKE_DESIGN_PATH + "' '" + hxb + "'";
    ASSERT_EQ(std::system(command.c_str()), 0) << command;
    const std::string t0 = dir.file("counter.vrx");
    ASSERT_TRUE(database_to_text(hxb, t0));
    expect_stable(t0, dir, true);
}

/// The real netlists: each converted or read in a scratch directory of its own.
class RealNetlists : public ::testing::Test {
  protected:
    void SetUp() override {
        root_ = netlists_dir();
        if (!fs::is_directory(root_))
            GTEST_SKIP() << "no netlists folder at '" << root_ << "' (set VRX_NETLISTS)";
    }

    /// Skips a text too large for a sanitized build; true when skipped.
    static bool too_large(const std::string& path) {
        if (!VRX_SANITIZED || fs::file_size(path) <= kSanitizedTextLimit) return false;
        std::printf("[  SKIPPED ] %s: too large for a sanitized build\n", path.c_str());
        return true;
    }

    std::string root_;
};

TEST_F(RealNetlists, EpflCircuitsAreStable) {
    const fs::path epfl = fs::path(root_) / "epfl";
    const fs::path script = fs::path(root_) / "aig2vrx.py";
    if (!fs::is_directory(epfl) || !fs::exists(script))
        GTEST_SKIP() << "no EPFL circuits or aig2vrx.py in '" << root_ << "'";
    if (std::system("python3 -c '' >/dev/null 2>&1") != 0)
        GTEST_SKIP() << "python3 is needed to convert the EPFL circuits";
    std::vector<fs::path> circuits;
    for (const auto& entry : fs::directory_iterator(epfl))
        if (entry.path().extension() == ".aig") circuits.push_back(entry.path());
    std::sort(circuits.begin(), circuits.end());
    ASSERT_FALSE(circuits.empty());
    for (const fs::path& aig : circuits) {
        SCOPED_TRACE(aig.filename().string());
        ScratchDir dir;
        const std::string t0 = dir.file(aig.stem().string() + ".vrx");
        const std::string command =
            "python3 '" + script.string() + "' '" + aig.string() + "' -o '" + t0 + "' >/dev/null";
        ASSERT_EQ(std::system(command.c_str()), 0) << command;
        if (too_large(t0)) continue;
        expect_stable(t0, dir, true);
    }
}

TEST_F(RealNetlists, ProcessorCoresAreStable) {
    for (const char* core : {"serv/serv.vrx", "picorv32/picorv32.vrx", "biriscv/biriscv.vrx"}) {
        SCOPED_TRACE(core);
        const std::string t0 = (fs::path(root_) / core).string();
        if (!fs::exists(t0)) {
            ADD_FAILURE() << "missing " << t0;
            continue;
        }
        if (too_large(t0)) continue;
        ScratchDir dir;
        expect_stable(t0, dir, true);
    }
}

// --- Database -> text -> database -----------------------------------------------

/// Reads the text `path` as a design or library, hands the converter to
/// `check`, then deletes what was read. Reading must report nothing but the
/// design-rule check's findings.
template <class Check>
void read_back(const std::string& path, bool is_design, Check check) {
    MsgCapture capture;
    HX_LIBRARY* library = nullptr;
    {
        VRX vrx;
        const VX_STATUS read = vrx.vrx_read(path.c_str(), is_design ? 1 : 0, 0, 0);
        EXPECT_TRUE(read == VX_OK || read == VX_DRC_ERROR) << reports(capture);
        library = vrx.get_library();
        if (library != nullptr) check(vrx);
    }
    for (const CapturedMsg& m : capture.messages()) {
        const bool drc = m.module == kDrcModule || m.text.starts_with("DRC ");
        if (m.level != PORT_MSG_STATUS && !drc)
            ADD_FAILURE() << "reading " << path << ": " << m.module << ": " << m.text;
    }
    if (library != nullptr) hx_env.delete_library(library);
}

TEST(DatabaseRoundTrip, ExpressibleRandomDesignsComeBackEqual) {
    vrx_test::CompareOptions compare;
    compare.structural = true;
    for (uint64_t seed = 1; seed <= 40; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        ScratchDir dir;
        HX_LIBRARY* original = hx_env.create_library("work", 0);
        HX_DESIGN* design = original->create_design("top");
        vrx_test::fill_random_design(*design, seed, expressible());
        const std::string hxb = dir.file("top.hxb");
        const std::string text = dir.file("top.vrx");
        if (store(hxb, design, nullptr) && database_to_text(hxb, text)) {
            read_back(text, true, [&](const VRX& vrx) {
                EXPECT_EQ(vrx_test::compare_designs(*design, *vrx.get_design(), compare), "");
            });
        }
        hx_env.delete_library(original);
    }
}

TEST(DatabaseRoundTrip, ExpressibleRandomLibrariesComeBackEqual) {
    vrx_test::CompareOptions compare;
    compare.structural = true;
    compare.extra_designs = true;
    for (uint64_t seed = 1; seed <= 15; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        ScratchDir dir;
        HX_LIBRARY* original = vrx_test::make_random_library(hx_env, seed, 3, expressible());
        const std::string name = original->get_name();
        const std::string hxl = dir.file(name + ".hxl");
        const std::string text = dir.file(name + ".vrx");  // the library's name on reading
        if (store(hxl, nullptr, original) && database_to_text(hxl, text)) {
            read_back(text, false, [&](const VRX& vrx) {
                EXPECT_EQ(vrx_test::compare_libraries(*original, *vrx.get_library(), compare), "");
            });
        }
        hx_env.delete_library(original);
    }
}

// --- Depth ---------------------------------------------------------------------

/// `depth` unnamed blocks below the root, each inside the one before, and a
/// net through every level, from the root's pin to the innermost block.
HX_DESIGN* make_chain(HX_LIBRARY& library, const char* name, uint32_t depth) {
    HX_DESIGN* design = library.create_design(name);
    HX_BLOCK* block = design->create_logblock(nullptr, 1, name);
    block->get_pin(0)->set_name("p");
    block->get_pin(0)->set_dir(HX_PIN_IN);
    for (uint32_t level = 1; level <= depth; ++level) {
        HX_SIGNAL* net = design->create_signal(block, "n");
        design->create_conn(net, block, 0);
        block = design->create_logblock(static_cast<HX_BASELOGBLOCK*>(block), 1, nullptr);
        block->get_pin(0)->set_name("p");
        block->get_pin(0)->set_dir(HX_PIN_IN);
        design->create_conn(net, block, 0);
    }
    return design;
}

uint32_t deepest(const HX_DESIGN& design) {
    uint32_t depth = 0;
    for (size_t i = 0; i < design.block_count(); ++i)
        depth = std::max(depth, design.block_at(i)->get_depth());
    return depth;
}

// Deeper than any call stack: every walk over the hierarchy keeps its own
// stack. Unnamed blocks keep the text linear in depth (a named level
// repeats the names above it).
TEST(DepthRoundTrip, HundredThousandLevelsCrossFilesGraftsAndTheWriter) {
    constexpr uint32_t kDepth = 100'000;
    ScratchDir dir;
    HX_LIBRARY* library = hx_env.create_library("deep", 0);
    HX_DESIGN* chain = make_chain(*library, "chain", kDepth);
    const std::string hxb = dir.file("chain.hxb");
    ASSERT_TRUE(store(hxb, chain, nullptr));
    {
        MsgCapture capture;
        VRX vrx;
        ASSERT_EQ(vrx.hxb_read(hxb.c_str()), VX_OK) << reports(capture);
        const HX_DESIGN& read = *vrx.get_design();
        EXPECT_EQ(read.block_count(), kDepth + 1);
        EXPECT_EQ(deepest(read), kDepth);
        EXPECT_EQ(read.network_count(), 1u);
        const std::string text = dir.file("chain.vrx");
        ASSERT_EQ(vrx.vrx_write(text.c_str(), nullptr, 0), VX_OK) << reports(capture);
        const std::string written = ScratchDir::read_file(text);
        std::size_t sections = 0;
        for (std::size_t at = 0; (at = written.find("\nDESIGN ", at)) != std::string::npos; ++at)
            ++sections;
        EXPECT_EQ(sections, kDepth);
        hx_env.delete_library(read.get_library());
    }
    HX_DESIGN* outer = library->create_design("outer");
    HX_LOGBLOCK* instance =
        outer->instantiate(outer->create_logblock(nullptr, 0, "outer"), chain, 1);
    ASSERT_NE(outer->graft(instance, chain, 0, 0, nullptr, 0), nullptr);
    EXPECT_EQ(deepest(*outer), kDepth + 1);
    hx_env.delete_library(library);
}

}  // namespace
