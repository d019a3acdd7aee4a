// The text writer: headers, pins, signals, map signals and the walk of a
// design's hierarchy.
//
// A design becomes a flat sequence of DESIGN sections. Every block that has
// children gets a section of its own, written before the section that
// instantiates it (deepest first); the design's own section comes last. A
// section holds its block's header and pins, one statement group per child,
// then the statements of signals that carry what pins cannot (global
// signals, signal and network properties), and in the design's own section
// the map signals.
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

#include "hx_design.h"
#include "hx_library.h"
#include "hx_property.h"
#include "vrx.h"
#include "vx_typenames.h"
#include "vx_write_internal.h"

namespace {

constexpr uint16_t kNoNumber = 0xFFFF;
constexpr uint8_t kPadRole = 7;  // the PAD role of a primitive pin

// " <number>", in a buffer of the caller's.
std::string_view number_text(char (&buffer)[16], long long value) {
    buffer[0] = ' ';
    const auto r = std::to_chars(buffer + 1, buffer + sizeof buffer, value);
    return std::string_view(buffer, static_cast<std::size_t>(r.ptr - buffer));
}

// Calls `fn` for every block below `top`, each after the blocks below it,
// siblings in order. The walk keeps its own stack: a hierarchy may be far
// deeper than the call stack would allow.
template <class Fn>
void for_each_below(const HX_BLOCK* top, Fn&& fn) {
    using Children = std::unique_ptr<UT_BLIST_ITER<HX_BLOCK>>;
    std::vector<std::pair<HX_BLOCK*, Children>> stack;
    stack.emplace_back(nullptr, Children(top->create_child_iter()));
    while (!stack.empty()) {
        HX_BLOCK* child = stack.back().second->l_next();
        if (child != nullptr && child->child_count() != 0) {
            stack.emplace_back(child, Children(child->create_child_iter()));
        } else if (child != nullptr) {
            fn(child);
        } else {
            HX_BLOCK* done = stack.back().first;
            stack.pop_back();
            if (done != nullptr) fn(done);
        }
    }
}

// Child statements name the signals on the children's pins, which lie
// anywhere in the design, and their names lie elsewhere again. Waiting for
// each of those reads in turn would dominate the writing of a large
// netlist. The walk over children therefore takes them in batches and reads
// the signals, then the names, of a whole batch before writing it: reads
// that do not depend on each other overlap.
constexpr int kBatch = 16;          // children per batch
constexpr uint16_t kPinsAhead = 8;  // pins per child read ahead

// A load whose value is not needed. Unlike a prefetch hint it cannot be
// dropped (hints are, for instance, on pages that a virtual machine has not
// mapped yet).
template <class T>
void touch(T value) {
    asm volatile("" ::"r"(value));
}

void read_ahead(HX_BLOCK* const* children, int count) {
    const char* names[kBatch * kPinsAhead];
    int n = 0;
    for (int c = 0; c < count; ++c) {
        const uint16_t pins = std::min<uint16_t>(children[c]->get_pin_count(), kPinsAhead);
        for (uint16_t i = 0; i < pins; ++i)
            if (const HX_SIGNAL* signal = children[c]->get_pin(i)->get_outer_signal())
                names[n++] = signal->get_name();
    }
    for (int i = 0; i < n; ++i)
        if (names[i] != nullptr) touch(*names[i]);
}

template <class Fn>
void for_each_child_ahead(const HX_BLOCK* block, Fn&& fn) {
    if (block->child_count() == 0) return;
    HX_BLOCK* batch[kBatch];
    // Owned, so that an exception of the host's progress hook leaks nothing.
    const std::unique_ptr<UT_BLIST_ITER<HX_BLOCK>> iter(block->create_child_iter());
    for (;;) {
        int count = 0;
        while (count < kBatch) {
            HX_BLOCK* next = iter->l_next();
            if (next == nullptr) break;
            batch[count++] = next;
        }
        if (count == 0) break;
        read_ahead(batch, count);
        for (int c = 0; c < count; ++c)
            fn(batch[c]);
    }
}

bool sits_in_root(const HX_BLOCK* block) {
    const HX_BLOCK* parent = block->get_parent();
    return parent != nullptr && parent->get_parent() == nullptr;
}

// A block directly in a root and named like that root would be taken for the
// root itself where its label names it.
bool named_like_its_root(const HX_BLOCK* block, const char* plain) {
    return sits_in_root(block) && UT_STR::Compare(plain, block->get_parent()->get_name()) == 0;
}

}  // namespace

// --- type names and headers -------------------------------------------------------

const char* VRX::pin_type(const HX_PIN* pin) {
    const char* keyword = vx_pin_type_name(pin->get_dir());
    if (keyword != nullptr) return keyword;
    vx_write_fatal(__LINE__, "cannot find pin type name for pin '%s'\n", vx_text(pin->get_name()));
    return "";
}

const char* VRX::prim_name(const HX_PRIMITIVE* prim, uint16_t index) {
    const HX_BLOCK* block = prim->get_block();
    if (index == kNoNumber) {
        const char* keyword = vx_prim_type_name(prim->get_type());
        if (keyword != nullptr) return keyword;
        vx_write_fatal(__LINE__, "cannot find prim type name for block '%s'\n",
                       vx_text(block->get_name()));
        return "";
    }
    const HX_PIN_PRIMITIVE* pin = prim->get_prim_pin(index);
    const char* keyword = pin != nullptr ? vx_prim_pin_name(pin->get_role()) : nullptr;
    if (keyword != nullptr) return keyword;
    vx_write_fatal(__LINE__, "cannot find prim pin name for block '%s' pin %d\n",
                   vx_text(block->get_name()), index);
    return "";
}

// The database keeps no name common to all objects, so the caller passes the
// object's name beside the object.
void VRX::write_object_header(const char* keyword, const HX_OBJECT* object, const char* object_name,
                              std::string_view given_name, uint16_t number, uint8_t no_name,
                              uint8_t no_props) {
    const VX_LEGALNAME label = vrx_legal(object_name, object);
    write_indent(2, keyword, given_name.data() != nullptr ? given_name : label.view());
    char digits[16];
    if (number != kNoNumber) write_item(number_text(digits, number));
    uint8_t opened = 0;
    if (!no_name) {
        write_entry(" (NAME=", label.view(), false);
        opened = 1;
    }
    if (!no_props) write_prop_list(object, &opened, nullptr);
    if (opened) write_item(")");
}

// "OBJ_$<identity>_<name>": the label of a block named like its root.
VX_LEGALNAME VRX::root_clash_label(const HX_BLOCK* block, const char* plain) {
    std::string text;
    vx_append_invented(text, invented_identity(block));
    (text += '_') += plain;
    return vrx_legal(text.c_str(), block).keep();
}

void VRX::write_user_flag(const HX_BLOCK* block) {
    if (!omit_user && !block->is_physical() && block->get_user()) write_item(" USER");
}

void VRX::write_blk_header(HX_BLOCK* block, uint8_t root, uint8_t pin_count) {
    const char* plain = block->get_name();
    const char* hier = build_hiername(block);
    // A root compared as a section labels its children as a section does.
    const bool in_root = sits_in_root(block) && block->get_parent() != scratch_top;
    VX_LEGALNAME label;
    if (!vx_present(plain) || !vx_present(hier))
        label = vrx_legal(nullptr, block);
    else if (root)
        label = vrx_legal(plain, block);
    else if (in_root && named_like_its_root(block, plain))
        label = root_clash_label(block, plain);
    else if (in_root || !block->isempty())
        label = vrx_legal(hier, block).keep();
    else
        label = vrx_legal(plain, block);
    write_indent(2, block->is_physical() ? "PHYSBLOCK" : "BLOCK", label.view());
    char digits[16];
    if (root || pin_count) write_item(number_text(digits, block->get_pin_count()));
    write_entry(" (NAME=", vrx_legal(plain, block).view(), false);
    write_user_flag(block);
    uint8_t opened = 1;
    if (!root) write_prop_list(block, &opened, nullptr);
    write_item(")");
}

void VRX::write_prim_header(HX_PRIMITIVE* prim, uint8_t physical, uint8_t no_props) {
    HX_BLOCK* block = prim->get_block();
    write_indent(2, physical ? "PHYSPRIM" : "PRIM", prim_name(prim, kNoNumber));
    char digits[16];
    if (prim->get_width() != kNoNumber) write_item(number_text(digits, prim->get_width()));
    write_entry(" (NAME=", vrx_legal(block->get_name(), block).view(), false);
    write_user_flag(block);
    uint8_t opened = 1;
    if (!no_props) write_prop_list(block, &opened, nullptr);
    write_item(")");
}

// --- pins --------------------------------------------------------------------------

// One entry: `head` (the lead-in, the name and "=") and the value, as one
// item or, with `pair`, as the pair of the lead-in and the rest; that only
// decides where the line may break.
void VRX::write_entry(std::string_view head, std::string_view value, bool pair) {
    break_before(head.size() + value.size(), pair);
    put(head);
    put(value);
}

void VRX::write_root_pins(HX_BLOCK* block) {
    begin_construct();
    if (!block->is_primitive()) {
        for (uint16_t i = 0; i < block->get_pin_count(); ++i) {
            const HX_PIN* pin = block->get_pin(i);
            write_indent(2, "PIN", vrx_legal(pin->get_name(), pin).view());
            write_pin_props(pin, block, 1, 0);
        }
    } else {
        HX_PRIMITIVE* prim = block->get_primitive();
        for (uint16_t i = 0; i < prim->get_pin_count(); ++i) {
            write_indent(2, "PIN", prim_name(prim, i));
            write_primpin_props(prim->get_prim_pin(i), block, 1);
        }
    }
    end_construct();
}

void VRX::write_blk_pins(HX_BLOCK* block, uint8_t with_types) {
    begin_construct();
    for (uint16_t i = 0; i < block->get_pin_count(); ++i) {
        const HX_PIN* pin = block->get_pin(i);
        write_indent(2, "PIN", vrx_legal(pin->get_name(), pin).view());
        write_pin_props(pin, block, 0, with_types);
    }
    end_construct();
}

void VRX::write_prim_pins(HX_PRIMITIVE* prim) {
    begin_construct();
    const HX_BLOCK* block = prim->get_block();
    for (uint16_t i = 0; i < prim->get_pin_count(); ++i) {
        write_indent(2, "PIN", prim_name(prim, i));
        write_primpin_props(prim->get_prim_pin(i), block, 0);
    }
    end_construct();
}

void VRX::write_pin_props(const HX_PIN* pin, const HX_BLOCK* block, uint8_t root,
                          uint8_t with_types) {
    if (root) {
        write_joined(" (", true);
        write_entry("TYPE=", pin_type(pin), false);
        if (const HX_SIGNAL* inner = pin->get_inner_signal())
            write_entry(" CONN=", vrx_legal(inner->get_name(), inner).view(), false);
        end_line(")");
        return;
    }
    uint8_t opened = 0;
    if (with_types) {
        write_joined(" (", true);
        opened = 1;
        write_entry("TYPE=", pin_type(pin), false);
    }
    if (const HX_SIGNAL* outer = pin->get_outer_signal()) {
        if (opened) {
            write_item(" ");
        } else {
            write_joined(" (", true);
            opened = 1;
        }
        write_entry("CONN=", vrx_legal(outer->get_name(), outer).view(), false);
    }
    write_blkpin_props(pin, block, &opened);
    if (opened)
        end_line(")");
    else
        write_string("\r\n", nullptr);
}

void VRX::write_primpin_props(const HX_PIN_PRIMITIVE* pin, const HX_BLOCK* block, uint8_t root) {
    write_joined(" (", true);
    write_entry("NAME=", vrx_legal(pin->get_name(), pin).view(), false);
    if (pin->get_inverted()) write_pair(" ", "INV");
    const HX_SIGNAL* signal = root ? pin->get_inner_signal() : pin->get_outer_signal();
    if (root || pin->get_role() == kPadRole) write_entry(" TYPE=", pin_type(pin), true);
    if (signal != nullptr)
        write_entry(" CONN=", vrx_legal(signal->get_name(), signal).view(), true);
    if (!root) {
        uint8_t opened = 1;
        write_prop_list(pin, &opened, block);
    }
    end_line(")");
}

void VRX::write_blkpin_props(const HX_PIN* pin, const HX_BLOCK* block, uint8_t* opened) {
    write_prop_list(pin, opened, block);
}

// --- signals and map signals ---------------------------------------------------------

void VRX::write_signal_props(HX_BLOCK* block) {
    const char* keyword = block->is_physical() ? "PHYSSIGNAL" : "SIGNAL";
    signal_section = block;
    UT_BLIST_ITER<HX_SIGNAL>* globals = block->create_global_siglist(1);
    while (HX_SIGNAL* g = globals->l_next()) {
        write_indent(4, keyword, vrx_legal(g->get_name(), g).view(), "(", "GLOBAL");
        uint8_t opened = 1;
        write_prop_list(g, &opened, nullptr);
        if (const HX_NETWORK* net = g->get_network()) write_prop_list(net, &opened, nullptr);
        end_line(")");
    }
    block->delete_global_siglist(globals);

    UT_BLISTS_ITER<HX_SIGNAL>* signals = block->create_signal_iter();
    while (HX_SIGNAL* s = signals->l_next()) {
        const HX_NETWORK* net = s->get_network();
        const bool own = has_props(s);
        const bool of_net = net != nullptr && net->get_highest_signal() == s && has_props(net);
        if (!own && !of_net) continue;
        write_indent(2, keyword, vrx_legal(s->get_name(), s).view());
        uint8_t opened = 0;
        if (own) write_prop_list(s, &opened, nullptr);
        if (of_net) write_prop_list(net, &opened, nullptr);
        // Every property may still have been left out (a time stamp, say):
        // the statement then ends without a list.
        if (opened)
            end_line(")");
        else
            write_string("\r\n", nullptr);
    }
    block->delete_signal_iter(signals);
    signal_section = nullptr;
}

// The blocks below `root` first, deepest first, then the root's own.
void VRX::write_map_signals(HX_BASEPHYSBLOCK* root) {
    auto write_own = [&](HX_BLOCK* plain) {
        auto* block = static_cast<HX_BASEPHYSBLOCK*>(plain);
        std::optional<VX_LEGALNAME> label;  // made when a statement needs it
        for (uint16_t i = 0; i < block->get_pin_count(); ++i) {
            const HX_PIN* pin = block->get_pin(i);
            if (pin->get_map_signal() != nullptr)
                write_pin_mapsignal(block, pin, mapsignal_label(block, label));
        }
        write_unmapped_children(block, label);
    };
    for_each_below(root, write_own);
    write_own(root);
}

const VX_LEGALNAME& VRX::mapsignal_label(HX_BASEPHYSBLOCK* block,
                                         std::optional<VX_LEGALNAME>& label) {
    if (!label) label = vrx_legal(build_hiername(block), block).keep();
    return *label;
}

void VRX::write_pin_mapsignal(HX_BASEPHYSBLOCK* block, const HX_PIN* pin,
                              const VX_LEGALNAME& label) {
    const HX_MAPSIGNAL* map = pin->get_map_signal();
    write_indent(2, "MAPSIGNAL", label.view());
    write_pair(" ", vrx_legal(pin->get_name(), pin).view());
    uint8_t opened = 0;
    // The map signal's own name, which the reader takes from NAME; without
    // it a named map signal would come back unnamed.
    if (vx_present(map->get_name())) {
        write_entry(" (NAME=", vrx_legal(map->get_name(), map).view(), false);
        opened = 1;
    }
    write_prop_list(map, &opened, nullptr);
    if (opened) write_item(")");
    begin_construct();
    HX_SIGNAL::CONN_ITER* conns = map->create_conn_iter();
    while (HX_CONN* conn = conns->l_next()) {
        HX_BLOCK* target = conn->get_block();
        if (target == block) continue;
        const HX_PIN* target_pin = conn->get_pin();
        const VX_LEGALNAME target_label = vrx_legal(build_hiername(target), target).keep();
        write_indent(3, "MAPCONN", target_label.view(),
                     vrx_legal(target_pin->get_name(), target_pin).view());
        if (target_pin->get_mapinv()) write_item(" (MAPINV)");
        write_string("\r\n", nullptr);
    }
    map->delete_conn_iter(conns);
    end_construct();
}

// Logical blocks placed in this physical block without a map signal: one
// MAPSIGNAL statement without pin names them all.
void VRX::write_unmapped_children(HX_BASEPHYSBLOCK* block, std::optional<VX_LEGALNAME>& label) {
    UT_BLIST_ITER<HX_BLOCK>* children = block->create_log_child_iter();
    bool opened = false;
    while (HX_BLOCK* child = children->l_next()) {
        bool mapped = false;
        for (uint16_t i = 0; i < child->get_pin_count() && !mapped; ++i)
            mapped = child->get_pin(i)->get_map_signal() != nullptr;
        if (mapped) continue;
        if (!opened) {
            write_indent(2, "MAPSIGNAL", mapsignal_label(block, label).view());
            begin_construct();
            opened = true;
        }
        const VX_LEGALNAME child_label = vrx_legal(build_hiername(child), child).keep();
        write_indent(3, "MAPCONN", child_label.view(), "\r\n");
    }
    block->delete_log_child_iter(children);
    if (opened) end_construct();
}

// --- design traversal -------------------------------------------------------------------

void VRX::write_design() {
    log_root = design->get_log_root();
    phys_root = design->get_phys_root();
    if (log_root == nullptr && phys_root == nullptr)
        vx_write_msg(__LINE__).issueWarning(
            "design %s has no root block; text cannot hold such a design, so the text written "
            "will not read back\n",
            vx_text(design->get_name()));
    write_contents(log_root, 0);
    write_contents(phys_root, 1);
    write_root_design();
}

// A section for every block with children below `root`, deepest first.
void VRX::write_contents(HX_BLOCK* root, uint8_t physical) {
    if (root == nullptr) return;
    for_each_below(root, [&](HX_BLOCK* block) {
        if (block->child_count() != 0) traverse(block, physical);
    });
}

// The section of one block with children.
void VRX::traverse(HX_BLOCK* block, uint8_t physical) {
    const char* plain = block->get_name();
    const char* hier = build_hiername(block);
    VX_LEGALNAME design_name;
    VX_LEGALNAME block_name;
    if (vx_present(plain) && vx_present(hier)) {
        block_name = vrx_legal(hier, block).keep();
        design_name =
            named_like_its_root(block, plain) ? root_clash_label(block, plain) : block_name;
    } else {
        design_name = vrx_legal(nullptr, block);
        block_name = design_name;
    }
    write_object_header("DESIGN", block, plain, design_name.view(), kNoNumber, 1, 1);
    begin_construct();
    if (HX_PRIMITIVE* prim = block->get_primitive())
        write_prim_header(prim, physical, 1);
    else
        write_object_header(physical ? "PHYSBLOCK" : "BLOCK", block, plain, block_name.view(),
                            block->get_pin_count(), 1, 1);
    write_root_pins(block);
    for_each_child_ahead(block, [&](HX_BLOCK* child) { write_child(child, physical); });
    write_signal_props(block);
    end_construct();
}

// --- library designs written as sections ----------------------------------------------

// The name that reading back gives the design of each section of the
// library's designs, with the block written as it; the first block wins. A
// block without a name is labelled by identity and left out.
std::unordered_map<std::string, HX_BLOCK*> VRX::library_sections() {
    std::unordered_map<std::string, HX_BLOCK*> sections;
    UT_BLIST_ITER<HX_LIBLINK>* links = library->create_liblink_iter();
    while (HX_LIBLINK* link = links->l_next()) {
        UT_BLIST_ITER<HX_BLOCK>* blocks = link->get_design()->create_block_iter();
        while (HX_BLOCK* block = blocks->l_next()) {
            const char* plain = block->get_name();
            if (block->get_parent() == nullptr || block->child_count() == 0 || !vx_present(plain))
                continue;
            std::string hier = vx_text(block->get_hiername());
            if (hier.empty()) continue;
            if (block->find_prop("TRANSPARENT") != nullptr) hier += ".TRANSPARENT";
            if (named_like_its_root(block, plain)) {
                hier.clear();
                vx_append_invented(hier, invented_identity(block));
                (hier += '_') += plain;
            }
            sections.try_emplace(section_key(std::move(hier)), block);
        }
        link->get_design()->delete_block_iter(blocks);
    }
    library->delete_liblink_iter(links);
    return sections;
}

// Design names as the library tells them apart.
std::string VRX::section_key(std::string name) const {
    if (!library->get_casesense())
        std::transform(name.begin(), name.end(), name.begin(), [](char c) {
            return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
        });
    return name;
}

namespace {

// An anonymous scratch file, gone when closed.
struct SCRATCH_FILE {
    std::FILE* file = std::tmpfile();
    ~SCRATCH_FILE() {
        if (file != nullptr) std::fclose(file);
    }
    int fd() const { return ::fileno(file); }
};

bool same_bytes(int a, int b) {
    struct stat sa;
    struct stat sb;
    if (::fstat(a, &sa) != 0 || ::fstat(b, &sb) != 0 || sa.st_size != sb.st_size) return false;
    static constexpr std::size_t kChunk = std::size_t{1} << 16;
    std::vector<char> x(kChunk), y(kChunk);
    for (off_t at = 0; at < sa.st_size;) {
        const ssize_t n = ::pread(a, x.data(), kChunk, at);
        if (n <= 0 || ::pread(b, y.data(), static_cast<std::size_t>(n), at) != n ||
            std::memcmp(x.data(), y.data(), static_cast<std::size_t>(n)) != 0)
            return false;
        at += n;
    }
    return true;
}

}  // namespace

// Whether leaving `candidate` out loses nothing: the section written for
// `section` (a block of another design) has the same text as the candidate's
// root written as a section, and the candidate carries nothing that a
// section does not (design properties, a root of the other kind, map
// signals, a USER flag on its root). Anything uncertain counts as different.
bool VRX::same_as_section(HX_DESIGN* candidate, HX_BLOCK* section) {
    const bool physical = section->is_physical();
    HX_BLOCK* root = physical ? static_cast<HX_BLOCK*>(candidate->get_phys_root())
                              : static_cast<HX_BLOCK*>(candidate->get_log_root());
    const HX_BLOCK* other = physical ? static_cast<HX_BLOCK*>(candidate->get_log_root())
                                     : static_cast<HX_BLOCK*>(candidate->get_phys_root());
    UT_BLIST_ITER<HX_MAPSIGNAL>* maps = candidate->create_mapsignal_iter();
    const bool has_maps = maps->l_next() != nullptr;
    candidate->delete_mapsignal_iter(maps);
    if (root == nullptr || other != nullptr || has_maps || root->child_count() == 0 ||
        (!omit_user && root->get_user()) || has_props(candidate))
        return false;
    const SCRATCH_FILE theirs, mine;
    return theirs.file != nullptr && mine.file != nullptr &&
           write_scratch_section(theirs.fd(), section->get_design(), section) &&
           write_scratch_section(mine.fd(), candidate, root) && same_bytes(theirs.fd(), mine.fd());
}

// Writes the section of `block` of design `owner` (with its own sections
// first) into `fd`, leaving the state of the text being written as it was.
bool VRX::write_scratch_section(int fd, HX_DESIGN* owner, HX_BLOCK* block) {
    const int copy = ::dup(fd);
    if (copy < 0) return false;
    Port::Stream stream(Port::ACCESS_WRITE, std::size_t{1} << 16);
    stream.attach(copy, "", true);
    // What the text being written keeps, put back however the section ends.
    struct SAVED {
        VRX& vrx;
        Port::Stream* stream;
        HX_DESIGN* design;
        int32_t column;
        int16_t indent;
        uint32_t constructs;
        uint32_t unreadable;
        VX_PROGRESS_FN progress;
        ~SAVED() {
            vrx.out_stream = stream;
            vrx.design = design;
            vrx.column = column;
            vrx.indent = indent;
            vrx.constructs_written = constructs;
            vrx.unreadable_names = unreadable;
            vrx.progress_fn = progress;
            vrx.scratch_write = false;
            vrx.scratch_top = nullptr;
        }
    } const saved{*this,  out_stream,         design,           column,
                  indent, constructs_written, unreadable_names, progress_fn};
    out_stream = &stream;
    design = owner;
    column = 0;
    indent = 0;
    progress_fn = nullptr;
    scratch_write = true;
    scratch_top = block;
    traverse(block, block->is_physical());
    return stream.flush() && !stream.failed();
}

void VRX::write_child(HX_BLOCK* block, uint8_t physical) {
    HX_PRIMITIVE* prim = block->get_primitive();
    if (prim != nullptr && block->child_count() == 0) {
        write_prim_header(prim, physical, 0);
        write_prim_pins(prim);
    } else if (block->child_count() != 0) {
        write_blk_header(block, 0, 0);
        write_blk_pins(block, 0);
    } else {
        write_blk_header(block, 0, 1);
        write_blk_pins(block, 1);
    }
}

void VRX::write_root_header(HX_BLOCK* root, uint8_t physical) {
    if (root->is_primitive())
        write_prim_header(root->get_primitive(), physical, 1);
    else
        write_blk_header(root, 1, 0);
    write_root_pins(root);
}

void VRX::write_root_design() {
    const VX_LEGALNAME name = vrx_legal(design->get_name(), design);
    write_object_header("DESIGN", design, design->get_name(), name.view(), kNoNumber, 1, 0);
    begin_construct();
    if (log_root != nullptr) write_root_header(log_root, 0);
    if (phys_root != nullptr) write_root_header(phys_root, 1);
    if (log_root != nullptr)
        for_each_child_ahead(log_root, [&](HX_BLOCK* child) { write_child(child, 0); });
    if (phys_root != nullptr)
        for_each_child_ahead(phys_root, [&](HX_BLOCK* child) { write_child(child, 1); });
    if (log_root != nullptr) write_signal_props(log_root);
    if (phys_root != nullptr) {
        write_signal_props(phys_root);
        write_map_signals(phys_root);
    }
    end_construct();
}
