// Written text against the real scanner and parser: random designs and
// libraries, written through vrx_write, parse without a single message, and
// every pin name, however odd, reaches the parser unchanged.
#include <gtest/gtest.h>

#include <fstream>
#include <set>
#include <sstream>
#include <string>

#include "hx_library.h"
#include "port_file.h"
#include "random_design.h"
#include "recorder.h"
#include "scratch_dir.h"
#include "ut_ptrfile.h"
#include "vrx.h"

namespace {

std::string slurp(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

void store_library(HX_LIBRARY* library, const std::string& path) {
    UT_PTRFILE file(Port::ACCESS_WRITE);
    ASSERT_NE(Port::File::open(path.c_str(), &file, false), nullptr);
    ASSERT_TRUE(hx_env.write_library(&file, library));
    ASSERT_TRUE(Port::File::close(&file));
}

std::set<std::string> block_pin_names(HX_LIBRARY* library) {
    std::set<std::string> names;
    UT_BLIST_ITER<HX_LIBLINK>* links = library->create_liblink_iter();
    while (HX_LIBLINK* link = links->l_next()) {
        UT_BLIST_ITER<HX_BLOCK>* blocks = link->get_design()->create_block_iter();
        while (HX_BLOCK* block = blocks->l_next()) {
            if (block->is_primitive()) continue;
            for (uint16_t i = 0; i < block->get_pin_count(); ++i) {
                const char* name = block->get_pin(i)->get_name();
                if (name != nullptr && *name != '\0') names.insert(name);
            }
        }
        link->get_design()->delete_block_iter(blocks);
    }
    library->delete_liblink_iter(links);
    return names;
}

TEST(WrittenText, RandomLibrariesParseCleanlyWithTheirNamesIntact) {
    ScratchDir dir;
    vrx_test::RandomDesignOptions options;
    options.quotes_in_names = false;
    for (uint64_t seed = 1; seed <= 25; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        HX_LIBRARY* library = vrx_test::make_random_library(hx_env, seed, 3, options);
        const std::string hxl = dir.file("lib.hxl");
        const std::string vrx = dir.file("lib.vrx");
        store_library(library, hxl);
        {
            VRX converter;
            Port_MsgSink quiet = Port_MsgDispatcher::set_sink(
                [](Port_MsgLevel, const Port_MsgLocation&, std::string_view) {});
            ASSERT_EQ(converter.hxb_read(hxl.c_str()), VX_OK);
            ASSERT_EQ(converter.vrx_write(vrx.c_str(), nullptr, 0), VX_OK);
            Port_MsgDispatcher::set_sink(quiet);
        }
        const Parsed parsed = parse_text(slurp(vrx));
        EXPECT_EQ(parsed.result, 0);
        std::string calls;
        for (const std::string& event : parsed.events) {
            for (const char* report : {"ERROR", "WARNING", "exit("})
                EXPECT_NE(event.rfind(report, 0), 0u) << event;
            calls += event + "\n";
        }
        for (const std::string& name : block_pin_names(library))
            EXPECT_NE(calls.find("do_pin(" + name + ", "), std::string::npos) << name;
        hx_env.delete_library(library);
    }
}

}  // namespace
