// Design-rule check of designs and libraries.
//
// Each check has a number, a meaning and a status that says what a finding
// is: ignored, a warning or an error. Every finding is one message at that
// level, naming the design and the hierarchical names involved, unless a
// report limit holds a flood back (see setReportLimit).
//
// Drivers and loads. A network's drivers and loads are the pins at which the
// net ends:
//   - a primitive pin, seen from its outer signal: OUT drives, IN loads;
//   - a pin of a block without contents (no child blocks, no signals: a
//     black box), seen from its outer signal, likewise by its direction;
//   - a pin of a root block, seen from its inner signal: the design's
//     surroundings drive an IN pin and load an OUT or TRI pin;
//   - a global signal is driven from outside the design.
// A pin of a block with contents passes the net through and counts on
// neither side. A BI pin both drives and loads. TRI and BI pins, PULLUP and
// PULLDOWN outputs and global signals drive weakly: they count as drivers for
// the undriven-network check, but never as a second driver. NOTYPE pins
// neither drive nor load.
//
// Cost: two passes over the blocks' pins, with two bytes of state per
// network, then a walk of the members and connections of the networks found
// at fault only: linear in the design's size.
#pragma once

#include <cstdint>
#include <string>

class HX_BLOCK;
class HX_DESIGN;
class HX_LIBRARY;
class HX_PIN;

class Hxb_DRC {
  public:
    /// The checks. Default status in brackets.
    enum Check : int {
        CHECK_NO_ROOT = 1,           // a design with neither root [warning]
        CHECK_UNNAMED_PIN = 2,       // a pin without a name [warning]
        CHECK_DUPLICATE_PIN = 3,     // two pins of one block share a name [error]
        CHECK_MULTIPLE_DRIVERS = 4,  // two or more strong drivers on one network [error]
        CHECK_UNCONNECTED_PIN = 7,   // a pin of a child block or primitive without
                                     // outer signal, unless it carries UNUSED [error]
        CHECK_UNDRIVEN_NET = 9,      // a network with loads but no driver [error]
    };
    static constexpr int kCheckSlots = 10;

    enum Status : int {
        STATUS_IGNORE = 0,
        STATUS_WARNING = 1,
        STATUS_ERROR = 2,
    };

    Hxb_DRC();
    ~Hxb_DRC() = default;

    /// Sets the status of a check; an unknown check or status is ignored.
    void setCheck(Check check, Status status);
    Status getCheck(Check check) const;

    /// Prints at most `limit` findings of each check in a run (0, the
    /// default: every one). A check with findings held back then gets one
    /// line at its level with their number, followed by `hint` (how to see
    /// them all). Counts and results stay exact.
    void setReportLimit(int limit, std::string hint);
    /// Findings of `check` found in the last run but not printed.
    int getNumOmitted(Check check) const;

    /// Checks one design, or every design of a library. Returns 0 when
    /// nothing was found, 1 when only warnings were, 2 when errors were. The
    /// counts cover the last run.
    int run(HX_DESIGN* design);
    int run(HX_LIBRARY* library);
    int getNumErrors() const { return errors_; }
    int getNumWarnings() const { return warnings_; }

  private:
    class Pass;

    void start_run();
    void check_design(const HX_DESIGN& design);
    void report(Check check, const std::string& text);
    void report_omitted() const;
    int result() const;

    Status status_[kCheckSlots];
    int errors_ = 0;
    int warnings_ = 0;
    int found_[kCheckSlots] = {};  // per check, in the last run
    int limit_ = 0;
    std::string hint_;
};
