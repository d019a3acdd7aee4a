#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "hx_property.h"
#include "hxb_propfilter.h"
#include "msg_capture.h"
#include "scratch_dir.h"

namespace {

using Texts = std::vector<std::string>;

class PropFilterTest : public testing::Test {
  protected:
    std::unique_ptr<Hxb_PropFilter> make(
        const std::string& rules, Hxb_PropFilter::Direction dir = Hxb_PropFilter::FROM_DATABASE) {
        const std::string path = dir_.file("filter.txt");
        ScratchDir::write_file(path, rules);
        return std::make_unique<Hxb_PropFilter>(path.c_str(), &status_, nullptr, dir);
    }

    // The name `name` passes under, or "-" when it is left out.
    static std::string mapped_name(Hxb_PropFilter& filter, const char* name) {
        const auto prop = HX_PROPERTY::make_int(name, 5);
        const HX_PROPERTY* out = nullptr;
        const bool kept = filter.map_prop(prop.get(), out);
        EXPECT_EQ(kept, out != nullptr);
        if (out == nullptr) return "-";
        EXPECT_EQ(out->get_int(), 5);
        return out->get_name();
    }

    ScratchDir dir_;
    Hxb_PropFiltStatus status_ = HXB_PROPFILT_NOT_READ;
};

constexpr const char* kRules =
    "# leave out and rename\r\n"
    "\n"
    "   DEBUG_KEEP = KEPT   # before the prefix rule, so it wins\n"
    "DEBUG_*\n"
    "LOC=PLACE\n"
    "\tOLD_*=NEW_*\n"
    "LOC  \n"
    "TIMESTAMP";

TEST_F(PropFilterTest, RulesLeaveOutRenameAndPassTheRest) {
    MsgCapture capture;
    auto filter = make(kRules);
    EXPECT_EQ(status_, HXB_PROPFILT_READ);
    EXPECT_EQ(filter->status(), HXB_PROPFILT_READ);
    EXPECT_EQ(filter->rule_count(), 6u);
    EXPECT_TRUE(capture.messages().empty());

    EXPECT_EQ(mapped_name(*filter, "DEBUG_KEEP"), "KEPT");
    EXPECT_EQ(mapped_name(*filter, "DEBUG_X"), "-");
    EXPECT_EQ(mapped_name(*filter, "DEBUG_"), "-");
    EXPECT_EQ(mapped_name(*filter, "DEBUG"), "DEBUG");
    EXPECT_EQ(mapped_name(*filter, "LOC"), "PLACE");
    EXPECT_EQ(mapped_name(*filter, "loc"), "loc");
    EXPECT_EQ(mapped_name(*filter, "LOCX"), "LOCX");
    EXPECT_EQ(mapped_name(*filter, "OLD_A"), "NEW_A");
    EXPECT_EQ(mapped_name(*filter, "OLD_"), "NEW_");
    EXPECT_EQ(mapped_name(*filter, "TIMESTAMP"), "-");

    // Unmatched: the property itself. Renamed: a copy of the whole value.
    const auto init = HX_PROPERTY::make_text("INIT", HX_PROP_STRING, "x");
    const HX_PROPERTY* out = nullptr;
    EXPECT_TRUE(filter->map_prop(init.get(), out));
    EXPECT_EQ(out, init.get());
    const auto delay = HX_PROPERTY::make_timing("OLD_DELAY", {1, 2, HX_UNIT_NS});
    EXPECT_TRUE(filter->map_prop(delay.get(), out));
    EXPECT_STREQ(out->get_name(), "NEW_DELAY");
    HX_PROP_TIMING_DATA record;
    EXPECT_TRUE(out->get_timing(record));
    EXPECT_EQ(record, (HX_PROP_TIMING_DATA{1, 2, HX_UNIT_NS}));
    EXPECT_STREQ(delay->get_name(), "OLD_DELAY");

    EXPECT_FALSE(filter->map_prop(nullptr, out));
    EXPECT_EQ(out, nullptr);
}

TEST_F(PropFilterTest, IntoTheDatabaseRenamesTheOtherWayRound) {
    auto filter = make(kRules, Hxb_PropFilter::INTO_DATABASE);
    EXPECT_EQ(status_, HXB_PROPFILT_READ);
    EXPECT_EQ(mapped_name(*filter, "KEPT"), "DEBUG_KEEP");
    EXPECT_EQ(mapped_name(*filter, "PLACE"), "LOC");
    EXPECT_EQ(mapped_name(*filter, "NEW_A"), "OLD_A");
    EXPECT_EQ(mapped_name(*filter, "OLD_A"), "OLD_A");
    EXPECT_EQ(mapped_name(*filter, "DEBUG_X"), "-");
    EXPECT_EQ(mapped_name(*filter, "LOC"), "-");  // the later leave-out rule
}

TEST_F(PropFilterTest, FilesWithoutRulesAndARuleForEverything) {
    auto filter = make("\n# nothing\n   # at all");
    EXPECT_EQ(status_, HXB_PROPFILT_READ);
    EXPECT_EQ(filter->rule_count(), 0u);
    EXPECT_EQ(mapped_name(*make("*"), "ANY"), "-");
}

TEST_F(PropFilterTest, AFileThatCannotBeReadGivesStatusOne) {
    MsgCapture capture;
    Hxb_PropFiltStatus status = HXB_PROPFILT_READ;
    Hxb_PropFilter missing(dir_.file("missing").c_str(), &status, nullptr,
                           Hxb_PropFilter::FROM_DATABASE);
    EXPECT_EQ(status, HXB_PROPFILT_CANNOT_OPEN);
    Hxb_PropFilter directory(dir_.path().c_str(), &status, nullptr, Hxb_PropFilter::FROM_DATABASE);
    EXPECT_EQ(status, HXB_PROPFILT_CANNOT_OPEN);
    Hxb_PropFilter unnamed(nullptr, nullptr, nullptr, Hxb_PropFilter::FROM_DATABASE);
    EXPECT_EQ(unnamed.status(), HXB_PROPFILT_CANNOT_OPEN);
    EXPECT_EQ(mapped_name(unnamed, "ANY"), "ANY");
    // The caller reports the failure; the filter adds nothing.
    EXPECT_TRUE(capture.messages().empty());
}

TEST_F(PropFilterTest, AMalformedLineGivesStatusTwoAndAMessageNamingIt) {
    const std::vector<std::pair<std::string, std::string>> cases = {
        {"=NEW", "a name is missing: '=NEW'"},
        {"OLD = # gone", "a name is missing: 'OLD = # gone'"},
        {"A B", "a name holds a blank: 'A B'"},
        {"A=B=C", "more than one '=': 'A=B=C'"},
        {"A*B", "'*' may only end a name: 'A*B'"},
        {"A*=B", "a prefix can only be renamed to a prefix: 'A*=B'"},
        {std::string("A\0B", 3), "the line holds a NUL byte: 'A'"},
    };
    for (const auto& [line, reason] : cases) {
        MsgCapture capture;
        auto filter = make("KEEP\n# fine\n" + line + "\nDROP\n");
        EXPECT_EQ(status_, HXB_PROPFILT_MALFORMED) << line;
        const std::string path = dir_.file("filter.txt");
        EXPECT_EQ(capture.texts(PORT_MSG_ERROR),
                  Texts{"property filter file '" + path + "', line 3: " + reason});
        // A filter that was not read in full leaves everything alone.
        EXPECT_EQ(filter->rule_count(), 0u);
        EXPECT_EQ(mapped_name(*filter, "KEEP"), "KEEP");
    }
}

}  // namespace
