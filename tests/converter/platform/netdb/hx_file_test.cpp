#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "design_compare.h"
#include "file_size_limit.h"
#include "hx_design.h"
#include "hx_file.h"
#include "hx_library.h"
#include "msg_capture.h"
#include "port_file.h"
#include "random_design.h"
#include "scratch_dir.h"
#include "ut_ptrfile.h"

namespace {

using vrx_test::compare_designs;
using vrx_test::compare_libraries;

const std::string kCannotRead = "cannot read database file '";

/// A library of the environment for the duration of a test.
class ScopedLibrary {
  public:
    explicit ScopedLibrary(HX_LIBRARY* library) : library_(library) {}
    ~ScopedLibrary() {
        if (library_ != nullptr) hx_env.delete_library(library_);
    }
    ScopedLibrary(const ScopedLibrary&) = delete;
    ScopedLibrary& operator=(const ScopedLibrary&) = delete;
    HX_LIBRARY* get() const { return library_; }

  private:
    HX_LIBRARY* library_;
};

/// A design made from a seed, in a library of its own.
struct SourceDesign {
    explicit SourceDesign(uint64_t seed, const vrx_test::RandomDesignOptions& options = {})
        : library(hx_env.create_library("source", 0)), design(library.get()->create_design("top")) {
        vrx_test::fill_random_design(*design, seed, options);
    }
    ScopedLibrary library;
    HX_DESIGN* design;
};

template <class Write>
bool write_file(const std::string& path, Write write) {
    UT_PTRFILE file(Port::ACCESS_WRITE);
    if (Port::File::open(path.c_str(), &file, true) == nullptr) return false;
    const bool written = write(&file);
    return Port::File::close(&file) && written;
}

bool write_design(const std::string& path, HX_DESIGN* design) {
    return write_file(path, [&](UT_PTRFILE* file) { return hx_env.write_design(file, design); });
}

bool write_library(const std::string& path, HX_LIBRARY* library) {
    return write_file(path, [&](UT_PTRFILE* file) { return hx_env.write_library(file, library); });
}

/// Reads a design file the way the converter does: the type first, then
/// the design from the same file object.
HX_DESIGN* read_design(const std::string& path, bool ask_type = true) {
    UT_PTRFILE file(Port::ACCESS_READ);
    if (Port::File::open(path.c_str(), &file, true) == nullptr) return nullptr;
    if (ask_type && hx_env.get_file_type(&file) != HX_FILE_DESIGN) return nullptr;
    HX_DESIGN* design = hx_env.create_design(&file, 0);
    Port::File::close(&file);
    return design;
}

HX_LIBRARY* read_library(const std::string& path) {
    UT_PTRFILE file(Port::ACCESS_READ);
    if (Port::File::open(path.c_str(), &file, true) == nullptr) return nullptr;
    if (hx_env.get_file_type(&file) != HX_FILE_LIBRARY) return nullptr;
    HX_LIBRARY* library = hx_env.create_library(&file);
    Port::File::close(&file);
    return library;
}

/// The error texts issued while reading `bytes` as a design file.
std::vector<std::string> refusals_of(const std::string& path, const std::string& bytes) {
    ScratchDir::write_file(path, bytes);
    MsgCapture capture;
    const size_t libraries = hx_env.library_count();
    HX_DESIGN* design = read_design(path, false);
    EXPECT_EQ(design, nullptr);
    if (design != nullptr) hx_env.delete_library(design->get_library());
    EXPECT_EQ(hx_env.library_count(), libraries);
    return capture.texts(PORT_MSG_ERROR);
}

std::string refusal(const std::string& path, const std::string& reason) {
    return kCannotRead + path + "': " + reason + "\n";
}

HX_DESIGN* only_design(const HX_LIBRARY& library) {
    auto* links = library.create_liblink_iter();
    HX_DESIGN* design = links->l_next()->get_design();
    library.delete_liblink_iter(links);
    return design;
}

/// Gives the file a correct checksum again after an edit.
void reseal(std::string& bytes) {
    const uint32_t crc = HX_FILE_IO::checksum(bytes.data() + 12, bytes.size() - 12);
    for (int i = 0; i < 4; ++i)
        bytes[8 + i] = static_cast<char>(crc >> (8 * i));
}

void set_body_size(std::string& bytes) {
    const uint64_t body = bytes.size() - HX_FILE_IO::kHeaderSize;
    for (int i = 0; i < 8; ++i)
        bytes[16 + i] = static_cast<char>(body >> (8 * i));
}

vrx_test::RandomDesignOptions small_options() {
    vrx_test::RandomDesignOptions options;
    options.blocks = 8;
    options.signals = 8;
    options.globals = 2;
    options.connections = 20;
    options.props = 8;
    options.map_signals = 2;
    options.merges = 1;
    return options;
}

TEST(HxFile, ChecksumIsCrc32cWithOrWithoutProcessorSupport) {
    const char* check = "123456789";
    EXPECT_EQ(HX_FILE_IO::checksum(check, 9), 0xE3069283u);
    EXPECT_EQ(HX_FILE_IO::checksum_portable(check, 9), 0xE3069283u);
    std::string bytes;
    for (int i = 0; i < 1000; ++i)
        bytes.push_back(static_cast<char>(i * 7 + i / 13));
    for (size_t length : {0u, 1u, 7u, 8u, 9u, 63u, 1000u}) {
        EXPECT_EQ(HX_FILE_IO::checksum(bytes.data(), length),
                  HX_FILE_IO::checksum_portable(bytes.data(), length));
    }
    // Continuing a checksum equals taking it in one go.
    EXPECT_EQ(HX_FILE_IO::checksum(bytes.data() + 10, 990, HX_FILE_IO::checksum(bytes.data(), 10)),
              HX_FILE_IO::checksum(bytes.data(), 1000));
}

TEST(HxFile, DesignsRoundTripThroughTheFile) {
    ScratchDir dir;
    const std::string path = dir.file("top.hxb");
    for (uint64_t seed = 1; seed <= 40; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        SourceDesign source(seed);
        ASSERT_TRUE(write_design(path, source.design));
        HX_DESIGN* read = read_design(path, seed % 2 == 0);
        ASSERT_NE(read, nullptr);
        ScopedLibrary owner(read->get_library());
        EXPECT_STREQ(read->get_library()->get_name(), "top");
        EXPECT_EQ(compare_designs(*source.design, *read), "");
        // Writing what was read gives the same bytes.
        EXPECT_EQ(HX_FILE_IO::encode(*read), ScratchDir::read_file(path));
    }
}

TEST(HxFile, LibrariesRoundTripThroughTheFile) {
    ScratchDir dir;
    const std::string path = dir.file("lib.hxl");
    for (uint64_t seed = 1; seed <= 15; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        ScopedLibrary source(vrx_test::make_random_library(hx_env, seed, 1 + seed % 4));
        ASSERT_TRUE(write_library(path, source.get()));
        ScopedLibrary read(read_library(path));
        ASSERT_NE(read.get(), nullptr);
        EXPECT_EQ(compare_libraries(*source.get(), *read.get()), "");
        EXPECT_EQ(HX_FILE_IO::encode(*read.get()), ScratchDir::read_file(path));
    }
}

// Large designs are written in pieces and their connections gathered in
// runs of signals; a file spans several pieces, a name fills more than one,
// and a global signal's connections span many rounds of a run.
TEST(HxFile, LargeDesignsRoundTripAcrossPiecesAndRuns) {
    ScratchDir dir;
    vrx_test::RandomDesignOptions big;
    big.blocks = 4000;
    big.signals = 5000;
    big.globals = 30;
    big.connections = 16000;
    big.props = 300;
    big.map_signals = 40;
    big.merges = 10;
    SourceDesign source(21, big);
    HX_SIGNAL* wide = source.design->create_global_signal("wide");
    int fanout = 0;
    for (size_t b = 0; b < source.design->block_count(); ++b) {
        HX_BLOCK* block = source.design->block_at(b);
        // Primitives only: joining networks away could leave object
        // properties of the design pointing at a network that is gone.
        if (!block->is_primitive()) continue;
        for (uint16_t p = 0; p < block->get_pin_count(); ++p) {
            if (source.design->create_conn(wide, block, p) != nullptr) ++fanout;
        }
    }
    ASSERT_GT(fanout, 2000);
    // Names that end pieces early, and one longer than a piece.
    for (size_t b : {1, 2, 3}) {
        const std::string name((b == 3 ? 5u : 3u) << 20, static_cast<char>('a' + b));
        source.design->block_at(b)->set_name(name.c_str());
    }

    const std::string path = dir.file("big.hxb");
    ASSERT_TRUE(write_design(path, source.design));
    const std::string bytes = ScratchDir::read_file(path);
    ASSERT_GT(bytes.size(), 11u << 20);
    EXPECT_EQ(HX_FILE_IO::encode(*source.design), bytes);
    HX_DESIGN* read = read_design(path);
    ASSERT_NE(read, nullptr);
    ScopedLibrary owner(read->get_library());
    EXPECT_EQ(compare_designs(*source.design, *read), "");
    EXPECT_EQ(HX_FILE_IO::encode(*read), bytes);
}

TEST(HxFile, TheComparisonNamesTheFirstDifference) {
    SourceDesign source(11);
    const std::string bytes = HX_FILE_IO::encode(*source.design);
    std::string reason;
    auto read = HX_FILE_IO::decode(bytes.data(), bytes.size(), HX_FILE_DESIGN, reason);
    ASSERT_NE(read, nullptr) << reason;
    HX_DESIGN* copy = only_design(*read);
    ASSERT_EQ(compare_designs(*source.design, *copy), "");

    HX_BLOCK* block = nullptr;
    auto* blocks = copy->create_block_iter();
    while ((block = blocks->l_next()) != nullptr && block->get_pin_count() == 0) {
    }
    copy->delete_block_iter(blocks);
    ASSERT_NE(block, nullptr);
    HX_PIN* pin = block->get_pin(0);
    pin->set_dir(static_cast<uint8_t>(pin->get_dir() + 1));
    EXPECT_NE(compare_designs(*source.design, *copy).find("pin 0: direction"), std::string::npos);
    pin->set_dir(static_cast<uint8_t>(pin->get_dir() - 1));

    const char* name = pin->get_name();
    pin->set_name(name == nullptr ? "" : nullptr);
    EXPECT_NE(compare_designs(*source.design, *copy).find("name"), std::string::npos);
    pin->set_name(name);

    copy->create_global_signal("ANOTHER");
    EXPECT_NE(compare_designs(*source.design, *copy).find("count"), std::string::npos);
}

TEST(HxFile, EmptyDesignsAndLibrariesRoundTrip) {
    ScratchDir dir;
    ScopedLibrary source(hx_env.create_library(nullptr, 1));
    HX_DESIGN* empty = source.get()->create_design("");
    ASSERT_TRUE(write_design(dir.file("empty.hxb"), empty));
    HX_DESIGN* read = read_design(dir.file("empty.hxb"));
    ASSERT_NE(read, nullptr);
    ScopedLibrary owner(read->get_library());
    EXPECT_EQ(compare_designs(*empty, *read), "");
    EXPECT_STREQ(read->get_name(), "");

    ASSERT_TRUE(write_library(dir.file("lib.hxl"), source.get()));
    ScopedLibrary lib(read_library(dir.file("lib.hxl")));
    ASSERT_NE(lib.get(), nullptr);
    EXPECT_EQ(lib.get()->get_name(), nullptr);
    EXPECT_EQ(compare_libraries(*source.get(), *lib.get()), "");
}

TEST(HxFile, NetworkTagsOrderAndHighestSignalsSurvive) {
    ScopedLibrary source(hx_env.create_library("tags", 0));
    HX_DESIGN* d = source.get()->create_design("top");
    HX_LOGBLOCK* top = d->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* u1 = d->create_logblock(top, 3, "u1");
    HX_SIGNAL* inner = d->create_signal(u1, "x");   // tag 1
    HX_SIGNAL* a = d->create_signal(top, "a");      // tag 2
    HX_SIGNAL* b = d->create_signal(top, "b");      // tag 3
    HX_SIGNAL* g = d->create_global_signal("VCC");  // tag 4
    // x reaches both a and b through two pins: one network with two signals
    // of the same depth, whose highest depends on the order of joining.
    d->create_conn(inner, u1, 0);
    d->create_conn(inner, u1, 1);
    d->create_conn(b, u1, 1);
    d->create_conn(a, u1, 0);
    d->create_conn(g, u1, 2);
    HX_SIGNAL* merged = d->create_signal(top, "m");  // tag 5, then a new one when kept
    d->merge_signals(g, merged, 1, 0);
    a->get_network()->create_prop("NET", 7);

    const std::string bytes = HX_FILE_IO::encode(*d);
    std::string reason;
    auto read = HX_FILE_IO::decode(bytes.data(), bytes.size(), HX_FILE_DESIGN, reason);
    ASSERT_NE(read, nullptr) << reason;
    HX_DESIGN* copy = only_design(*read);
    EXPECT_EQ(compare_designs(*d, *copy), "");
    for (uint32_t tag = 0; tag < 10; ++tag) {
        const HX_NETWORK* original = d->find_net_tag(tag);
        const HX_NETWORK* again = hx_find_net_tag(copy, tag);
        ASSERT_EQ(original == nullptr, again == nullptr) << "tag " << tag;
        if (original != nullptr) {
            EXPECT_STREQ(again->get_name(), original->get_name());
        }
    }
    // New networks continue the original's numbering.
    EXPECT_EQ(d->create_signal(top, "n")->get_network()->get_tag(),
              copy->create_signal(copy->get_log_root(), "n")->get_network()->get_tag());
}

// A tag property naming a network that a join then took over follows it to
// the surviving network, in memory, through a graft and in the file.
TEST(HxFile, TagPropertiesFollowJoinedNetworks) {
    ScopedLibrary source(hx_env.create_library("joins", 0));
    HX_DESIGN* d = source.get()->create_design("top");
    HX_LOGBLOCK* top = d->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* u1 = d->create_logblock(top, 1, "u1");
    HX_SIGNAL* inner = d->create_signal(u1, "y");
    HX_SIGNAL* outer = d->create_signal(top, "o");
    HX_SIGNAL* m = d->create_signal(u1, "m");
    const uint32_t joined_tag = inner->get_network()->get_tag();
    m->get_network()->create_prop("MERGEDTO", static_cast<int32_t>(joined_tag));
    d->create_conn(inner, u1, 0);
    d->create_conn(outer, u1, 0);  // y's network joins o's, which survives
    ASSERT_EQ(d->find_net_tag(joined_tag), nullptr);
    ASSERT_EQ(d->follow_net_tag(joined_tag), outer->get_network());

    const std::string bytes = HX_FILE_IO::encode(*d);
    std::string reason;
    auto read = HX_FILE_IO::decode(bytes.data(), bytes.size(), HX_FILE_DESIGN, reason);
    ASSERT_NE(read, nullptr) << reason;
    HX_DESIGN* copy = only_design(*read);
    HX_NETWORK* m_again = nullptr;
    for (uint32_t tag = 0; tag <= 4; ++tag) {
        HX_NETWORK* net = copy->find_net_tag(tag);
        if (net != nullptr && std::strcmp(net->get_name(), "top/u1/m") == 0) m_again = net;
    }
    ASSERT_NE(m_again, nullptr);
    const HX_NETWORK* named =
        copy->find_net_tag(static_cast<uint32_t>(m_again->find_prop("MERGEDTO")->get_int()));
    ASSERT_NE(named, nullptr);
    EXPECT_STREQ(named->get_name(), "top/o");
}

TEST(HxFile, FileTypeIsToldFromTheHeaderAndTheFileCanStillBeRead) {
    ScratchDir dir;
    SourceDesign source(3, small_options());
    ScopedLibrary lib(vrx_test::make_random_library(hx_env, 3, 2, small_options()));
    ASSERT_TRUE(write_design(dir.file("d.hxb"), source.design));
    ASSERT_TRUE(write_library(dir.file("l.hxl"), lib.get()));
    ScratchDir::write_file(dir.file("text.vrx"), "VRX 1\r\n");
    ScratchDir::write_file(dir.file("empty"), "");
    auto type_of = [&](const char* name) {
        UT_PTRFILE file(Port::ACCESS_READ);
        if (Port::File::open(dir.file(name).c_str(), &file, true) == nullptr)
            return HX_FILE_UNKNOWN;
        return hx_env.get_file_type(&file);
    };
    EXPECT_EQ(type_of("d.hxb"), HX_FILE_DESIGN);
    EXPECT_EQ(type_of("l.hxl"), HX_FILE_LIBRARY);
    EXPECT_EQ(type_of("text.vrx"), HX_FILE_UNKNOWN);
    EXPECT_EQ(type_of("empty"), HX_FILE_UNKNOWN);
    EXPECT_EQ(type_of("missing"), HX_FILE_UNKNOWN);
    // After the type was asked, reading goes on from the file object as is.
    HX_DESIGN* read = read_design(dir.file("d.hxb"), true);
    ASSERT_NE(read, nullptr);
    ScopedLibrary owner(read->get_library());
    EXPECT_EQ(compare_designs(*source.design, *read), "");
}

TEST(HxFile, EveryTruncationIsRefusedWithItsLength) {
    ScratchDir dir;
    SourceDesign source(5, small_options());
    const std::string bytes = HX_FILE_IO::encode(*source.design);
    ASSERT_LT(bytes.size(), 4000u);
    const std::string path = dir.file("cut.hxb");
    for (size_t length = 0; length < bytes.size(); ++length) {
        SCOPED_TRACE("length " + std::to_string(length));
        const std::string reason =
            length < HX_FILE_IO::kHeaderSize
                ? "truncated (" + std::to_string(length) + " bytes, the header alone takes 32)"
                : "truncated (" + std::to_string(length) + " of " + std::to_string(bytes.size()) +
                      " bytes)";
        EXPECT_EQ(refusals_of(path, bytes.substr(0, length)),
                  std::vector<std::string>{refusal(path, reason)});
    }
}

TEST(HxFile, EverySingleByteChangeIsRefusedWithItsReason) {
    ScratchDir dir;
    SourceDesign source(6, small_options());
    const std::string bytes = HX_FILE_IO::encode(*source.design);
    const std::string path = dir.file("flip.hxb");
    for (size_t at = 0; at < bytes.size(); ++at) {
        for (uint8_t mask : {0x01, 0xFF}) {
            SCOPED_TRACE("byte " + std::to_string(at) + " mask " + std::to_string(mask));
            std::string changed = bytes;
            changed[at] = static_cast<char>(changed[at] ^ mask);
            std::string reason = "corrupt (checksum mismatch)";
            if (at < 8) {
                reason = "not a netlist database file";
            } else if (at >= 16 && at < 24) {
                // A changed length no longer matches the file's.
                uint64_t body = 0;
                for (int i = 7; i >= 0; --i)
                    body = body << 8 | static_cast<uint8_t>(changed[16 + i]);
                const uint64_t announced = body + 32;
                reason = announced > bytes.size()
                             ? "truncated (" + std::to_string(bytes.size()) + " of " +
                                   std::to_string(announced) + " bytes)"
                             : "corrupt (" + std::to_string(bytes.size()) +
                                   " bytes, the header announces " + std::to_string(announced) +
                                   ")";
            }
            EXPECT_EQ(refusals_of(path, changed), std::vector<std::string>{refusal(path, reason)});
        }
    }
}

TEST(HxFile, ContentChangesWithAValidChecksumAreRefusedOrReadConsistently) {
    SourceDesign source(7, small_options());
    const std::string bytes = HX_FILE_IO::encode(*source.design);
    int refused = 0;
    MsgCapture quiet;
    for (size_t at = HX_FILE_IO::kHeaderSize; at < bytes.size(); ++at) {
        for (uint8_t mask : {0x01, 0x10, 0xFF}) {
            std::string changed = bytes;
            changed[at] = static_cast<char>(changed[at] ^ mask);
            reseal(changed);
            std::string reason;
            auto read = HX_FILE_IO::decode(changed.data(), changed.size(), HX_FILE_DESIGN, reason);
            if (read == nullptr) {
                ++refused;
                EXPECT_EQ(reason.rfind("corrupt (", 0), 0u) << reason;
                continue;
            }
            // Whatever was accepted writes and reads back the same.
            const std::string again = HX_FILE_IO::encode(*only_design(*read));
            auto reread = HX_FILE_IO::decode(again.data(), again.size(), HX_FILE_DESIGN, reason);
            ASSERT_NE(reread, nullptr) << "byte " << at << ": " << reason;
            EXPECT_EQ(compare_libraries(*read, *reread), "") << "byte " << at;
        }
    }
    EXPECT_GT(refused, 0);
}

TEST(HxFile, InconsistentContentIsRefusedWithItsReason) {
    ScratchDir dir;
    const std::string path = dir.file("odd.hxb");
    SourceDesign source(8, small_options());
    const std::string bytes = HX_FILE_IO::encode(*source.design);

    std::string longer = bytes + std::string(4, '\0');
    set_body_size(longer);
    reseal(longer);
    EXPECT_EQ(refusals_of(path, longer),
              std::vector<std::string>{refusal(path, "corrupt (bytes after the content)")});

    // The design's name: "top" as a string of length 3 right after the header;
    // a length past the end, then a block count no content can hold.
    std::string runaway = bytes;
    ASSERT_EQ(runaway.substr(32, 8), std::string("\3\0\0\0top\0", 8));
    runaway[35] = '\x7f';
    reseal(runaway);
    EXPECT_EQ(refusals_of(path, runaway),
              std::vector<std::string>{refusal(path, "corrupt (a name runs past the end)")});
    std::string many = bytes;
    for (int i = 0; i < 4; ++i)
        many[45 + i] = '\xff';  // after name, flags and last tag
    reseal(many);
    EXPECT_EQ(refusals_of(path, many),
              std::vector<std::string>{refusal(path, "corrupt (a count exceeds the content)")});

    std::string zero_version = bytes;
    zero_version[12] = 0;
    reseal(zero_version);
    EXPECT_EQ(refusals_of(path, zero_version),
              std::vector<std::string>{refusal(path, "corrupt (bad header)")});
}

TEST(HxFile, ValuesThatNameNothingAreRefused) {
    const auto pinref = [](uint16_t pin, int32_t edge) {
        HX_PROP_PINREF_DATA record;
        record.pin = pin;
        record.edge = edge;
        return HX_PROPERTY::make_pinref("CLKREF", record);
    };
    const std::pair<std::function<void(HX_BLOCK*)>, std::string> cases[] = {
        {[&](HX_BLOCK* b) { b->get_pin(1)->create_prop(pinref(0, HX_EDGE_FALLING), nullptr); }, ""},
        {[](HX_BLOCK* b) { b->get_pin(0)->set_dir(HX_PIN_BI + 1); }, "a pin direction is unknown"},
        {[&](HX_BLOCK* b) { b->get_pin(1)->create_prop(pinref(2, HX_EDGE_RISING), nullptr); },
         "a pin reference names a pin its block does not have"},
        {[&](HX_BLOCK* b) { b->get_pin(1)->create_prop(pinref(0, 2), nullptr); },
         "a clock edge is unknown"},
        {[](HX_BLOCK* b) {
             b->create_prop(HX_PROPERTY::make_timing("SETUP", {1, 2, 4}), nullptr);
         },
         "a time unit is unknown"},
    };
    for (const auto& [change, reason] : cases) {
        HX_LIBRARY library("lib", 0);
        HX_DESIGN* design = library.create_design("d");
        HX_LOGBLOCK* top = design->create_logblock(nullptr, 2, "top");
        top->get_pin(0)->set_name("clk");
        change(top);
        const std::string bytes = HX_FILE_IO::encode(*design);
        std::string refusal;
        const auto read = HX_FILE_IO::decode(bytes.data(), bytes.size(), HX_FILE_DESIGN, refusal);
        EXPECT_EQ(read == nullptr, !reason.empty()) << reason;
        EXPECT_EQ(refusal, reason.empty() ? "" : "corrupt (" + reason + ")");
    }
}

TEST(HxFile, FilesOfTheOtherKindOrANewerVersionAreRefused) {
    ScratchDir dir;
    SourceDesign source(9, small_options());
    ScopedLibrary lib(vrx_test::make_random_library(hx_env, 9, 2, small_options()));
    ASSERT_TRUE(write_design(dir.file("d.hxb"), source.design));
    ASSERT_TRUE(write_library(dir.file("l.hxl"), lib.get()));
    const size_t libraries = hx_env.library_count();
    MsgCapture capture;
    {
        UT_PTRFILE file(Port::ACCESS_READ);
        ASSERT_NE(Port::File::open(dir.file("d.hxb").c_str(), &file, true), nullptr);
        EXPECT_EQ(hx_env.create_library(&file), nullptr);
    }
    {
        UT_PTRFILE file(Port::ACCESS_READ);
        ASSERT_NE(Port::File::open(dir.file("l.hxl").c_str(), &file, true), nullptr);
        EXPECT_EQ(hx_env.create_design(&file, 0), nullptr);
    }
    EXPECT_EQ(hx_env.library_count(), libraries);
    EXPECT_EQ(capture.texts(PORT_MSG_ERROR),
              (std::vector<std::string>{
                  refusal(dir.file("d.hxb"), "a design file, not a library file"),
                  refusal(dir.file("l.hxl"), "a library file, not a design file")}));

    std::string newer = ScratchDir::read_file(dir.file("d.hxb"));
    newer[12] = 2;
    reseal(newer);
    const std::string path = dir.file("newer.hxb");
    EXPECT_EQ(refusals_of(path, newer),
              std::vector<std::string>{refusal(
                  path, "written by a newer version (format 2, this version reads format 1)")});
}

TEST(HxFile, QuietReadsIssueNoMessage) {
    ScratchDir dir;
    ScratchDir::write_file(dir.file("x.hxb"), "not a database");
    MsgCapture capture;
    UT_PTRFILE file(Port::ACCESS_READ);
    ASSERT_NE(Port::File::open(dir.file("x.hxb").c_str(), &file, true), nullptr);
    EXPECT_EQ(hx_env.create_design(&file, 1), nullptr);
    EXPECT_TRUE(capture.messages().empty());
    EXPECT_EQ(hx_env.create_design(nullptr, 0), nullptr);
    EXPECT_EQ(capture.texts(PORT_MSG_ERROR),
              std::vector<std::string>{"cannot read database file '': not open for reading\n"});
}

TEST(HxFile, AFailedWriteReportsAndLeavesNoFile) {
    ScratchDir dir;
    vrx_test::RandomDesignOptions big;
    big.blocks = 3000;
    big.signals = 3000;
    big.connections = 6000;
    SourceDesign source(10, big);
    ASSERT_GT(HX_FILE_IO::encode(*source.design).size(), 200000u);
    MsgCapture capture;
    const std::string path = dir.file("full.hxb");
    {
        FileSizeLimit limit(4096);
        UT_PTRFILE file(Port::ACCESS_WRITE);
        ASSERT_NE(Port::File::open(path.c_str(), &file, true), nullptr);
        EXPECT_FALSE(hx_env.write_design(&file, source.design));
        EXPECT_FALSE(Port::File::close(&file));
    }
    EXPECT_TRUE(dir.entries().empty());
    EXPECT_EQ(
        capture.texts(PORT_MSG_ERROR),
        std::vector<std::string>{"cannot write database file '" + path + "': File too large\n"});

    UT_PTRFILE nothing(Port::ACCESS_WRITE);
    ASSERT_NE(Port::File::open(path.c_str(), &nothing, true), nullptr);
    EXPECT_FALSE(hx_env.write_design(&nothing, nullptr));
    EXPECT_FALSE(Port::File::close(&nothing));
    EXPECT_TRUE(dir.entries().empty());
}

}  // namespace
