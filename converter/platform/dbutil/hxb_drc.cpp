#include "hxb_drc.h"

#include <algorithm>
#include <iterator>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "hx_design.h"
#include "hx_library.h"
#include "port_msg.h"
#include "ut_str.h"

namespace {

constexpr const char* kModule = "Hxb";
constexpr const char* kRevision = "$Revision: 1.0 $";

bool known_check(int check) {
    switch (check) {
        case Hxb_DRC::CHECK_NO_ROOT:
        case Hxb_DRC::CHECK_UNNAMED_PIN:
        case Hxb_DRC::CHECK_DUPLICATE_PIN:
        case Hxb_DRC::CHECK_MULTIPLE_DRIVERS:
        case Hxb_DRC::CHECK_UNCONNECTED_PIN:
        case Hxb_DRC::CHECK_UNDRIVEN_NET:
            return true;
        default:
            return false;
    }
}

void issue(Hxb_DRC::Status status, const std::string& text) {
    const Port_MsgManData msg = PORT_MSG(kModule, kRevision);
    if (status == Hxb_DRC::STATUS_ERROR)
        msg.issueError("%s", text.c_str());
    else
        msg.issueWarning("%s", text.c_str());
}

// What the line about held-back findings calls each check.
const char* check_title(int check) {
    switch (check) {
        case Hxb_DRC::CHECK_NO_ROOT:
            return "design without root block";
        case Hxb_DRC::CHECK_UNNAMED_PIN:
            return "pin without name";
        case Hxb_DRC::CHECK_DUPLICATE_PIN:
            return "pins sharing a name";
        case Hxb_DRC::CHECK_MULTIPLE_DRIVERS:
            return "network with more than one driver";
        case Hxb_DRC::CHECK_UNCONNECTED_PIN:
            return "pin without outer signal";
        default:
            return "network with loads but no driver";
    }
}

const char* text_or_empty(const char* text) {
    return text ? text : "";
}

std::string block_label(const HX_BLOCK& block) {
    return UT_STR::Format("block '%s'", block.get_hiername());
}

std::string pin_label(const HX_PIN& pin) {
    return UT_STR::Format("pin '%s' of %s", text_or_empty(pin.get_name()),
                          block_label(*pin.get_block()).c_str());
}

std::string net_label(const HX_NETWORK& net) {
    const char* name = net.get_name();
    if (name != nullptr) return UT_STR::Format("network '%s'", name);
    return UT_STR::Format("unnamed network with tag %u", net.get_tag());
}

// What a pin end does to its network.
enum class Role { None, Load, StrongDriver, WeakDriver, WeakDriverAndLoad };

Role role_of(uint8_t dir, bool weak_out) {
    switch (dir) {
        case HX_PIN_IN:
            return Role::Load;
        case HX_PIN_OUT:
            return weak_out ? Role::WeakDriver : Role::StrongDriver;
        case HX_PIN_TRI:
            return Role::WeakDriver;
        case HX_PIN_BI:
            return Role::WeakDriverAndLoad;
        default:
            return Role::None;
    }
}

// A root pin seen from inside: the surroundings drive its inputs and load its outputs.
Role root_role_of(uint8_t dir) {
    switch (dir) {
        case HX_PIN_IN:
            return Role::StrongDriver;
        case HX_PIN_OUT:
        case HX_PIN_TRI:
            return Role::Load;
        case HX_PIN_BI:
            return Role::WeakDriverAndLoad;
        default:
            return Role::None;
    }
}

bool drives_weakly(const HX_BLOCK& block) {
    const HX_PRIMITIVE* prim = block.get_primitive();
    if (prim == nullptr) return false;
    return prim->get_type() == HX_PRIM_PULLUP || prim->get_type() == HX_PRIM_PULLDOWN;
}

struct NetTally {
    uint32_t drivers = 0;
    uint32_t strong = 0;
    uint32_t loads = 0;
    const HX_PIN* strong_pins[2] = {nullptr, nullptr};

    void add(Role role, const HX_PIN* pin) {
        if (role == Role::Load || role == Role::WeakDriverAndLoad) ++loads;
        if (role == Role::None || role == Role::Load) return;
        ++drivers;
        if (role != Role::StrongDriver) return;
        if (strong < 2) strong_pins[strong] = pin;
        ++strong;
    }
};

// What one network's pins add up to, enough to tell whether it is at fault.
struct NetMark {
    uint8_t drivers = 0;  // any driver, weak or strong
    uint8_t loads = 0;
    uint8_t strong = 0;  // strong drivers, counted up to 2

    void add(Role role) {
        if (role == Role::Load || role == Role::WeakDriverAndLoad) loads = 1;
        if (role == Role::None || role == Role::Load) return;
        drivers = 1;
        if (role == Role::StrongDriver && strong < 2) ++strong;
    }
};

// What `pin` does to the net of `signal`, which is on one of its two sides.
Role role_at(const HX_PIN& pin, const HX_SIGNAL& signal) {
    const HX_BLOCK& block = *pin.get_block();
    if (pin.get_outer_signal() == &signal) {
        // A block with contents passes its nets through; only a black box ends them.
        if (!block.is_primitive() && !block.isempty()) return Role::None;
        return role_of(pin.get_dir(), drives_weakly(block));
    }
    return block.get_parent() == nullptr ? root_role_of(pin.get_dir()) : Role::None;
}

void tally_signal(const HX_SIGNAL& signal, NetTally& tally) {
    if (signal.is_global()) tally.add(Role::WeakDriver, nullptr);
    HX_SIGNAL::CONN_ITER* conns = signal.create_conn_iter();
    while (const HX_CONN* conn = conns->l_next()) {
        const HX_PIN& pin = *conn->get_pin();
        tally.add(role_at(pin, signal), &pin);
    }
    signal.delete_conn_iter(conns);
}

}  // namespace

// One check of one design: a walk over the blocks' pins, then the networks'
// tallies (see walk_networks).
class Hxb_DRC::Pass {
  public:
    Pass(Hxb_DRC& drc, const HX_DESIGN& design)
        : drc_(drc), design_(design), design_name_(text_or_empty(design.get_name())) {}

    void run() {
        if (design_.get_log_root() == nullptr && design_.get_phys_root() == nullptr) {
            report(CHECK_NO_ROOT, UT_STR::Format("design '%s' has no root block", design_name_));
            return;
        }
        walk_blocks();
        if (on(CHECK_UNDRIVEN_NET) || on(CHECK_MULTIPLE_DRIVERS)) walk_networks();
    }

  private:
    // Texts are composed only for checks that are on: a large design may
    // have many findings of an ignored check.
    bool on(Check check) const { return drc_.status_[check] != STATUS_IGNORE; }
    void report(Check check, const std::string& text) { drc_.report(check, text); }
    void report_in_design(Check check, const std::string& text) {
        report(check, UT_STR::Format("design '%s': %s", design_name_, text.c_str()));
    }

    void walk_blocks() {
        UT_BLIST_ITER<HX_BLOCK>* iter = design_.create_block_iter();
        while (const HX_BLOCK* block = iter->l_next()) {
            check_pins(*block);
            if (!block->is_primitive() && on(CHECK_DUPLICATE_PIN)) check_duplicate_pins(*block);
        }
        design_.delete_block_iter(iter);
    }

    void check_pins(const HX_BLOCK& block) {
        const bool is_root = block.get_parent() == nullptr;
        for (uint16_t i = 0; i < block.get_pin_count(); ++i) {
            const HX_PIN& pin = *block.get_pin(i);
            if (on(CHECK_UNNAMED_PIN) && (pin.get_name() == nullptr || *pin.get_name() == '\0'))
                report_in_design(CHECK_UNNAMED_PIN,
                                 UT_STR::Format("pin %u of %s has no name", unsigned(i),
                                                block_label(block).c_str()));
            if (!is_root && pin.get_outer_signal() == nullptr && on(CHECK_UNCONNECTED_PIN) &&
                pin.find_prop("UNUSED") == nullptr)
                report_in_design(CHECK_UNCONNECTED_PIN, pin_label(pin) + " has no outer signal");
        }
    }

    void check_duplicate_pins(const HX_BLOCK& block) {
        if (block.get_pin_count() < 2) return;
        std::unordered_set<std::string_view> seen;
        std::unordered_set<std::string_view> reported;
        for (uint16_t i = 0; i < block.get_pin_count(); ++i) {
            const char* name = block.get_pin(i)->get_name();
            if (name == nullptr || *name == '\0') continue;
            if (seen.insert(name).second || !reported.insert(name).second) continue;
            report_in_design(CHECK_DUPLICATE_PIN,
                             UT_STR::Format("%s has more than one pin named '%s'",
                                            block_label(block).c_str(), name));
        }
    }

    // Pass one tallies every network from the pins' side: the blocks and
    // their pin arrays lie in memory in order, so this is a near-sequential
    // sweep with two bytes of state per network. Only the networks it finds
    // at fault are walked member by member, for the texts of their reports.
    void walk_networks() {
        std::vector<NetMark> marks(design_.network_slots());
        UT_BLIST_ITER<HX_BLOCK>* blocks = design_.create_block_iter();
        while (const HX_BLOCK* block = blocks->l_next())
            mark_pins(*block, marks);
        design_.delete_block_iter(blocks);
        UT_BLIST_ITER<HX_SIGNAL>* globals = design_.create_global_iter();
        while (const HX_SIGNAL* global = globals->l_next())
            mark(marks, global, Role::WeakDriver);
        design_.delete_global_iter(globals);
        for (std::size_t slot = 0; slot < marks.size(); ++slot) {
            const NetMark& m = marks[slot];
            const bool undriven = m.loads && !m.drivers && on(CHECK_UNDRIVEN_NET);
            const bool multiple = m.strong > 1 && on(CHECK_MULTIPLE_DRIVERS);
            if (undriven || multiple) check_network(*design_.network_at(slot));
        }
    }

    static void mark(std::vector<NetMark>& marks, const HX_SIGNAL* signal, Role role) {
        if (signal == nullptr || role == Role::None || signal->get_network() == nullptr) return;
        marks[signal->get_network()->get_slot()].add(role);
    }

    static void mark_pins(const HX_BLOCK& block, std::vector<NetMark>& marks) {
        // A block with contents passes its nets through; only a black box ends them.
        const bool ends_nets = block.is_primitive() || block.isempty();
        const bool weak = drives_weakly(block);
        const bool is_root = block.get_parent() == nullptr;
        for (uint16_t i = 0; i < block.get_pin_count(); ++i) {
            const HX_PIN& pin = *block.get_pin(i);
            if (ends_nets) mark(marks, pin.get_outer_signal(), role_of(pin.get_dir(), weak));
            if (is_root) mark(marks, pin.get_inner_signal(), root_role_of(pin.get_dir()));
        }
    }

    void check_network(const HX_NETWORK& net) {
        NetTally tally;
        UT_BLIST_ITER<HX_SIGNAL>* members = net.create_signal_iter();
        while (const HX_SIGNAL* signal = members->l_next())
            tally_signal(*signal, tally);
        net.delete_signal_iter(members);

        if (on(CHECK_UNDRIVEN_NET) && tally.loads > 0 && tally.drivers == 0)
            report_in_design(CHECK_UNDRIVEN_NET, net_label(net) + " has loads but no driver");
        if (on(CHECK_MULTIPLE_DRIVERS) && tally.strong > 1) {
            // Labels first: each one reuses the design's name buffer.
            const std::string first = pin_label(*tally.strong_pins[0]);
            const std::string second = pin_label(*tally.strong_pins[1]);
            report_in_design(
                CHECK_MULTIPLE_DRIVERS,
                UT_STR::Format("%s has %u drivers, among them %s and %s", net_label(net).c_str(),
                               tally.strong, first.c_str(), second.c_str()));
        }
    }

    Hxb_DRC& drc_;
    const HX_DESIGN& design_;
    const char* design_name_;
};

Hxb_DRC::Hxb_DRC() {
    for (Status& status : status_)
        status = STATUS_IGNORE;
    status_[CHECK_NO_ROOT] = STATUS_WARNING;
    status_[CHECK_UNNAMED_PIN] = STATUS_WARNING;
    status_[CHECK_DUPLICATE_PIN] = STATUS_ERROR;
    status_[CHECK_MULTIPLE_DRIVERS] = STATUS_ERROR;
    status_[CHECK_UNCONNECTED_PIN] = STATUS_ERROR;
    status_[CHECK_UNDRIVEN_NET] = STATUS_ERROR;
}

void Hxb_DRC::setCheck(Check check, Status status) {
    if (!known_check(check)) return;
    if (status < STATUS_IGNORE || status > STATUS_ERROR) return;
    status_[check] = status;
}

Hxb_DRC::Status Hxb_DRC::getCheck(Check check) const {
    return known_check(check) ? status_[check] : STATUS_IGNORE;
}

void Hxb_DRC::setReportLimit(int limit, std::string hint) {
    limit_ = limit > 0 ? limit : 0;
    hint_ = std::move(hint);
}

int Hxb_DRC::getNumOmitted(Check check) const {
    if (!known_check(check) || limit_ == 0 || found_[check] <= limit_) return 0;
    return found_[check] - limit_;
}

void Hxb_DRC::start_run() {
    errors_ = 0;
    warnings_ = 0;
    std::fill(std::begin(found_), std::end(found_), 0);
}

int Hxb_DRC::run(HX_DESIGN* design) {
    start_run();
    if (design != nullptr) check_design(*design);
    report_omitted();
    return result();
}

int Hxb_DRC::run(HX_LIBRARY* library) {
    start_run();
    if (library == nullptr) return result();
    UT_BLIST_ITER<HX_LIBLINK>* iter = library->create_liblink_iter();
    while (const HX_LIBLINK* link = iter->l_next())
        check_design(*link->get_design());
    library->delete_liblink_iter(iter);
    report_omitted();
    return result();
}

void Hxb_DRC::check_design(const HX_DESIGN& design) {
    Pass(*this, design).run();
}

void Hxb_DRC::report(Check check, const std::string& text) {
    const Status status = status_[check];
    if (status == STATUS_IGNORE) return;
    ++(status == STATUS_ERROR ? errors_ : warnings_);
    if (++found_[check] > limit_ && limit_ != 0) return;
    issue(status, text);
}

// One line per check whose findings were held back, after all it printed.
void Hxb_DRC::report_omitted() const {
    for (int check = 0; check < kCheckSlots; ++check) {
        const int omitted = getNumOmitted(static_cast<Check>(check));
        if (omitted == 0) continue;
        issue(
            status_[check],
            UT_STR::Format("%d more findings '%s' not shown (the first %d are above)%s%s", omitted,
                           check_title(check), limit_, hint_.empty() ? "" : "; ", hint_.c_str()));
    }
}

int Hxb_DRC::result() const {
    if (errors_ > 0) return STATUS_ERROR;
    return warnings_ > 0 ? STATUS_WARNING : STATUS_IGNORE;
}
