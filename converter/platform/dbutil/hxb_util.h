// Helpers over the netlist database: reading property values from their text
// forms and writing them back, and small lookups that callers share.
//
// Text forms (parse_prop reads exactly what the form_* functions write):
//   integer       signed decimal, 32 bits: "-12"
//   float         decimal number: "2.5", "1e-3"
//   timing        MIN:MAXUNIT, a number left out when unset, the unit (ps, ns,
//                 us) left out when unset: "2:5ns", ":5ns", "7:", ":"
//   pin reference PIN[,R|F][,TIMING][,INV]: the name of a pin of the same block,
//                 the edge (rising or falling) when set, the timing form when
//                 any of its fields is set, INV when inverted: "CLK,R,0:2ns"
//   timing string the text as written
// Edge letters, INV and units are read in either case and written in the case
// shown. Numbers are plain decimal without blanks; -2147483648 is the "unset"
// marker of timing records and is refused as a value.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "hx_design.h"
#include "hx_property.h"
#include "hx_types.h"

class PM_PIC;

class Hxb_Util {
  public:
    /// A property named `name` made from the text `value` (null counts as
    /// empty), for attaching to an object of `block` (pin references name a
    /// pin of it). A predefined name takes its kind's text form; any other
    /// name gives a flag for an empty value, a parameter for "@x" (holding
    /// "x") and a string otherwise. Null when the value does not fit the
    /// kind, with the reason in `message`. A flag name given a value yields
    /// the flag and a message saying the value was ignored. `message` is
    /// left as it was when there is nothing to say.
    static std::unique_ptr<HX_PROPERTY> parse_prop(const char* name, const char* value,
                                                   std::string& message, HX_BLOCK* block);

    /// Index of the pin called `name`, or HX_NO_INDEX (also for a null block
    /// or name); `ignore_case` compares ASCII letters without regard to case.
    static uint16_t find_pin(const HX_BLOCK* block, const char* name, uint8_t ignore_case);
    /// The design's global signal called `name`, or null.
    static HX_SIGNAL* find_global_sig(const HX_DESIGN* design, const char* name);
    /// Text of the string property `name`; null when the object has none or
    /// the property is of another kind.
    static const char* get_string_prop(const HX_OBJECT* object, const char* name);
    /// Gives a logical block the string property PHYSICAL holding the device
    /// name of `pic`. False (nothing changed) for a null or physical block or
    /// a null `pic`.
    static bool set_physical_prop(HX_BLOCK* block, const PM_PIC* pic);

    /// The pin-reference text form of `record`, whose pin is one of `block`.
    /// A pin without a name, or an index with no pin of the block behind it,
    /// is written as "**UNDEFINED.<index>**", the name the reader gives an
    /// unnamed pin; only in the first case does such a pin exist on reading.
    /// The second case is also reported as a warning.
    static std::string form_pinref(const HX_PROP_PINREF_DATA& record, const HX_BLOCK* block);
    static std::string form_timing(const HX_PROP_TIMING_DATA& record);
    /// The text of a timing-string property; empty for null or a property
    /// that holds no text.
    static std::string form_timingstr(const HX_PROPERTY* prop);
};
