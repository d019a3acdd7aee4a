// Property rules on reading: reserved names of the library, designs and
// blocks, the device chosen by LOG_PM and the PHYSICAL flag, and the generic
// rule that parses every other property.
#include "builder_fixture.h"
#include "vx_builder_internal.h"

namespace builder_test {
namespace {

const char* const kPinrefOff = "PINREF properties are only allowed on pins";
const char* const kTimingOff = "TIMING properties are only allowed on pins";

TEST_F(BuilderTest, LibraryAndDesignPropertiesKeepTheirReservedMeanings) {
    ASSERT_EQ(read("(NAME=mylib CASESENSE=0 RCSID=x LP=@p CLKREF=a)\n"
                   "DESIGN d (NAME=other RCSID=y DP=1 SETUPREF=b MAXDELAY=1:2ns) {\n"
                   "   BLOCK d 1 { PIN a (TYPE=IN) }\n"
                   "}\n"),
              VX_PARSE_ERROR);
    HX_LIBRARY* lib = vrx.get_library();
    EXPECT_STREQ(lib->get_name(), "mylib");
    EXPECT_EQ(lib->get_casesense(), 1);  // the value is not looked at
    EXPECT_EQ(prop_names(lib), "LP ");
    EXPECT_EQ(prop_kind(lib, "LP"), HX_PROP_PARAM);
    EXPECT_EQ(text_prop(lib, "LP"), "p");
    EXPECT_STREQ(design()->get_name(), "d");  // NAME does not rename a design
    EXPECT_EQ(prop_names(design()), "DP ");

    const std::vector<std::string> got = reports();
    ASSERT_EQ(got.size(), 4u) << ::testing::PrintToString(got);
    EXPECT_EQ(got[0], E(1, kPinrefOff));
    // The wording of the NAME warning is the builder's own; its place is not.
    EXPECT_EQ(got[1].rfind("W Line number 2: ", 0), 0u) << got[1];
    EXPECT_EQ(got[2], E(2, kPinrefOff));
    EXPECT_EQ(got[3], E(2, kTimingOff));
    EXPECT_EQ(own_texts(PORT_MSG_ERROR), std::vector<std::string>{"parse of input file failed\n"});
}

TEST_F(BuilderTest, BlockPropertiesReservedAndParsed) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK top 1 (NAME=r USER=no RCSID=1 X=@p FANOUT=abc UNUSED=1 CLKREF=a\n"
                   "                MAXDELAY=1:2ns PHYSTYPE=x FANOUT=7) { PIN a (TYPE=IN) }\n"
                   "   BLOCK u 1 (NAME=\"\" USER) { PIN x }\n"
                   "   PHYSBLOCK d 1 { PIN p }\n"
                   "   PHYSBLOCK pb 1 (USER) { PIN q }\n"
                   "}\n"),
              VX_PARSE_ERROR);
    EXPECT_EQ(reports(), (std::vector<std::string>{
                             E(3, "property FANOUT: 'abc' is not an integer"),
                             W(3, "property UNUSED is a flag: value '1' ignored"),
                             E(3, kPinrefOff),
                             E(3, kTimingOff),
                             E(3, "PHYSTYPE keyword no longer supported"),
                             W(6, "Ignoring USER flag on physical block d/pb"),
                         }));
    HX_BLOCK* r = root();
    EXPECT_STREQ(r->get_name(), "r");
    EXPECT_EQ(r->get_user(), 1);
    EXPECT_EQ(prop_names(r), "X UNUSED FANOUT ");  // the bad FANOUT dropped, the good one kept
    EXPECT_EQ(prop_kind(r, "X"), HX_PROP_PARAM);
    EXPECT_EQ(prop_kind(r, "UNUSED"), HX_PROP_FLAG);
    EXPECT_EQ(r->find_prop("FANOUT")->get_int(), 7);
    HX_BLOCK* u = child(r, 0);
    ASSERT_NE(u->get_name(), nullptr);  // an empty NAME gives an empty name, not none
    EXPECT_STREQ(u->get_name(), "");
    EXPECT_EQ(u->get_user(), 1);
    EXPECT_EQ(block_named(design(), "d/pb", true)->get_user(), 0);
}

TEST_F(BuilderTest, PhysicalFlagTakesTheDeviceOfAValidLogPm) {
    ASSERT_EQ(read("(LOG_PM=QX20)\n"
                   "DESIGN d {\n"
                   "   BLOCK d 1 (PHYSICAL) { PIN a (TYPE=IN CONN=a) }\n"
                   "   BLOCK u 1 (PHYSICAL=qz400) { PIN x (CONN=a) }\n"
                   "   PHYSBLOCK d 1 (PHYSICAL) { PIN p }\n"
                   "}\n"),
              VX_OK);
    EXPECT_EQ(reports(),
              std::vector<std::string>{W(5, "PHYSICAL flag on physical block 'd' ignored")});
    EXPECT_EQ(text_prop(vrx.get_library(), "LOG_PM"), "QX20");
    EXPECT_EQ(text_prop(root(), "PHYSICAL"), "QX20");
    EXPECT_EQ(text_prop(block_named(design(), "d/u"), "PHYSICAL"), "qz400");
    EXPECT_EQ(prop_names(design()->get_phys_root()), "");
}

// The flag is process-wide and stays set; put it back for the tests that follow.
struct LogPmReset {
    ~LogPmReset() { log_pm_invalid = 0; }
};

TEST_F(BuilderTest, EmptyPhysicalAfterAnInvalidLogPmEndsTheRun) {
    LogPmReset reset;
    ASSERT_EQ(read("(LOG_PM=qx99)\n"
                   "DESIGN d {\n"
                   "   BLOCK d 1 (PHYSICAL) { PIN a (TYPE=IN CONN=a) }\n"
                   "   BLOCK u 1 (PHYSICAL) { PIN x (CONN=a) }\n"
                   "}\n"),
              VX_PARSE_ERROR);
    const std::string stop =
        "Empty PHYSICAL property found in design 'd', but library's LOG_PM value could not be "
        "validated. If the LOG_PM value is valid, the problem is most likely that the "
        "<pmname>.acd file was not in place when the LOG_PM property was processed.\n";
    const std::vector<std::string> got = reports();
    ASSERT_GE(got.size(), 2u) << ::testing::PrintToString(got);
    EXPECT_EQ(got[0], W(1, "invalid LOG_PM library property 'qx99' ignored\n"));
    EXPECT_EQ(got[1], E(3, stop));
    ASSERT_FALSE(capture.exits().empty());
    EXPECT_EQ(capture.exits()[0], 2);
    EXPECT_EQ(log_pm_invalid, 1);
    EXPECT_EQ(text_prop(vrx.get_library(), "LOG_PM"), "qx99");  // kept, though not used
    ASSERT_NE(root(), nullptr);                                 // the read went on past the stop
    EXPECT_EQ(root()->get_pin_count(), 1);
    EXPECT_EQ(root()->child_count(), 1u);
}

}  // namespace
}  // namespace builder_test
