// The converter between the netlist database and VRX text netlists.
//
// A host makes one VRX object and converts in either direction with it.
// Only one converter may exist at a time: the text reader reaches the
// converter under construction through the process-wide `active_vrx`.
//
// Ownership: the converter owns its database file object, its copy of the
// first input name, the property filter and the device description that a
// conversion makes. Designs and libraries belong to the database environment
// and stay valid for the host after the converter is gone.
#pragma once

#include <climits>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>

#include "hx_design.h"
#include "hx_library.h"
#include "pm_device.h"
#include "port_file.h"
#include "ut_btr_tree.h"
#include "ut_darray.h"
#include "ut_ptrfile.h"
#include "vrx_parser.h"
#include "vx_legalname.h"

class Hxb_PropFilter;
class HX_PROPERTY;
struct VX_LOOKUPS;

/// Result of the public conversion operations.
///
/// No exception of the library's leaves a conversion. Running out of memory
/// ends it like any other fatal condition: a fatal report naming what was
/// being built, then the host's exit handler with code 2 (the default one
/// ends the process); when the handler returns, the call returns
/// VX_PARSE_ERROR (vrx_read) or VX_FILE_ERROR (the others), with no
/// temporary file left.
enum VX_STATUS : int32_t {
    VX_OK = 0,
    VX_FILE_ERROR = 1,   // a file could not be opened, read or written; a bad filter file
    VX_PARSE_ERROR = 2,  // a text file did not parse
    VX_DRC_ERROR = 3,    // the design-rule check after reading found errors
};

/// The version ("MAJOR.MINOR.PATCH") of the shared library the program runs
/// with. Defined only in the shared library.
const char* vrx_library_version();

/// Progress of a long conversion step, for a host that shows it. `what`
/// names the step and its file ("reading top.vrx", "writing top.hxb") and is
/// valid during the call only; `done` of `total` counts bytes of that file:
///  - vrx_read, for each input: bytes read of the file's size;
///  - vrx_write: bytes of text written so far (`total` 0: not known yet);
///  - hxb_read: bytes decoded of the file's size, once it is in memory;
///  - hxb_write: bytes written of the file's size, once it is encoded.
/// `done` never decreases within a step, and the last report of a step that
/// completes has `done` equal to `total`. Reports come per chunk of work
/// (kilobytes of text, thousands of objects), often many a second: the host
/// decides how often to show them. The hook runs on the converter's thread
/// inside the conversion call and must not use the converter.
///
/// An exception thrown by the hook is the host's: it leaves the conversion
/// call after the conversion has cleaned up (files closed, a temporary file
/// removed, nothing leaked); the destination is left as it was, and the
/// converter is ready for the next call.
using VX_PROGRESS_FN = void (*)(void* context, const char* what, uint64_t done, uint64_t total);

/// Signals of the design being read, by name. Entries are non-owning
/// references to signals of `design`, in which missing signals are made.
class VX_SIGNALCACHE : public UT_BTR_TREE<HX_SIGNAL> {
  public:
    VX_SIGNALCACHE();
    ~VX_SIGNALCACHE() override;
    VX_SIGNALCACHE(const VX_SIGNALCACHE&) = default;
    VX_SIGNALCACHE& operator=(const VX_SIGNALCACHE&) = default;

    /// The signal called `name`; made in the design's physical root (when
    /// `physical` is set) or logical root when the cache has none. Null when
    /// it has to be made and the design or that root is missing.
    HX_SIGNAL* find_or_create(const char* name, uint8_t physical);
    /// Enters `signal` under its own name, replacing what the name held.
    void add_signal(HX_SIGNAL* signal);

    HX_DESIGN* design = nullptr;
};

class VRX {
  public:
    VRX();
    ~VRX();
    /// A copy shares the database objects and duplicates what it owns: the
    /// first input name is copied; the file object, the property filter and
    /// the device description stay with the source (the copy has none); the
    /// signal caches and the progress hook are copied. A copy becomes the
    /// active converter only for the length of its own vrx_read, so that
    /// what it reads, and the parse's outcome, are its own.
    VRX(const VRX& other);
    VRX& operator=(const VRX& other);

    HX_DESIGN* get_design() const { return design; }
    HX_LIBRARY* get_library() const { return library; }

    /// Installs the progress hook of the conversions that follow, called
    /// with `context`; a null `fn` removes it. Without a hook each chunk of
    /// work costs one test of the pointer.
    void set_progress(VX_PROGRESS_FN fn, void* context);

    // --- Database to text -----------------------------------------------------

    /// Loads the design (.hxb) or library (.hxl) file at `path` through the
    /// database environment and selects it for vrx_write. VX_FILE_ERROR, with
    /// an error message, when the file cannot be opened, is not a database
    /// file, or is refused by the database; what was loaded before stays.
    VX_STATUS hxb_read(const char* path);
    /// Writes what hxb_read (or vrx_read) loaded as a text netlist at `path`.
    /// `filter_file` names a property filter that every written property
    /// passes through (null keeps the filter of an earlier call);
    /// `omit_user` leaves out the USER flag of blocks. The text goes to a
    /// temporary file beside `path` first; `path` is replaced only by a
    /// complete file, and every failure leaves it untouched and removes the
    /// temporary file. A device, FIFO, socket or terminal, and "-" (standard
    /// output), are written in place (Port::ReplaceFile). A `path` that is the
    /// file read is refused. With SOURCE_DATE_EPOCH set, the header's time is
    /// that moment in UTC.
    VX_STATUS vrx_write(const char* path, const char* filter_file, uint8_t omit_user);

    // --- Text to database -----------------------------------------------------

    /// Reads the text netlists `names`, in order, into a new library named
    /// after the first name. A name without an extension is read with ".vrx"
    /// added; "-" is standard input. With `is_design` set the result is the last design the text
    /// defines, else the whole library; `make_physroot` derives a physical
    /// root for designs whose logical root carries PHYSICAL; `nograft` (for
    /// libraries only) keeps designs from being grafted into each other.
    /// Reading stops at the first file that fails to open (VX_FILE_ERROR) or
    /// to parse (VX_PARSE_ERROR); after the last file the design-rule check
    /// runs, and VX_DRC_ERROR means it found errors in a complete result.
    VX_STATUS vrx_read(const DARRAY_NAME& names, uint8_t is_design, uint8_t make_physroot,
                       uint8_t nograft);
    /// The same for one file.
    VX_STATUS vrx_read(const char* name, uint8_t is_design, uint8_t make_physroot, uint8_t nograft);
    /// The design-rule check after vrx_read prints at most 20 findings of
    /// each check, then one line with the number left out; with `all` set
    /// it prints every finding. Its counts are exact either way. Off by
    /// default; copies take the setting along.
    void set_all_findings(bool all) { all_findings = all; }
    /// Stores what vrx_read built, the last design (.hxb) or the library
    /// (.hxl), as a database file. A null `path` names the file after the
    /// first input of vrx_read; the extension is set to fit what is written
    /// (not for "-" or an existing device, FIFO or socket, written in place).
    /// `path` is replaced only by a complete file, and never when it is one
    /// of the files read; VX_FILE_ERROR otherwise.
    VX_STATUS hxb_write(const char* path);

  private:
    friend void vrx_do_library_props(VX_PROP_ARRAY*);
    friend void vrx_begin_design(const char*, VX_PROP_ARRAY*);
    friend void vrx_end_design();
    friend void vrx_add_alias(const char*, const char*);
    friend void vrx_begin_block(const char*, uint16_t, uint8_t, VX_PROP_ARRAY*);
    friend void vrx_begin_prim(const char*, uint16_t, uint8_t, VX_PROP_ARRAY*);
    friend void vrx_end_block();
    friend void vrx_do_pin(const char*, VX_PROP_ARRAY*);
    friend void vrx_do_signal(const char*, VX_SIGNAL_TYPE, VX_PROP_ARRAY*);
    friend void vrx_do_mapsignal(const char*, const char*, VX_PROP_ARRAY*);
    friend void vrx_add_mapconn(const char*, const char*, VX_PROP_ARRAY*);
    friend void vrx_set_parser_status(VX_PARSER_STATUS);
    friend struct VRX_TEST_ACCESS;

    void copy_from(const VRX& other);
    void release_owned();

    // The bodies of the public conversions, which run them through `guarded`:
    // out of memory is a fatal report, and a host's exception from the
    // progress hook reaches the caller after the files are let go.
    VX_STATUS load_database(const char* path);
    VX_STATUS write_text(const char* path, const char* filter_file, uint8_t omit_user);
    VX_STATUS read_texts(const DARRAY_NAME& names, uint8_t is_design, uint8_t make_physroot,
                         uint8_t nograft);
    VX_STATUS store_database(const char* path);
    template <class Body>
    VX_STATUS guarded(const char* doing, const char* path, VX_STATUS failed, Body&& body);
    void abandon_files();
    void report_out_of_memory(const char* doing, const char* path) const;

    // Progress reports (see set_progress): the step reported, and the
    // forwarders of the reader's and the database's own hooks.
    void begin_progress(const char* verb, const char* path);
    void report_progress(uint64_t done, uint64_t total) const {
        if (progress_fn != nullptr) call_progress(done, total);
    }
    void call_progress(uint64_t done, uint64_t total) const;
    void report_write_progress(bool complete);
    static void forward_progress(void* self, uint64_t done, uint64_t total);
    static void forward_scan_progress(void* self, uint64_t done);

    void init_curr_indices(uint16_t value);
    void set_parser_status(VX_PARSER_STATUS status);

    // Text to database: one input file, and the design-rule check.
    VX_STATUS read_one_file(const char* name);
    void warn_unused_designs() const;
    bool check();

    // Builder operations, one per kind of statement of a text netlist.
    void do_library_props(VX_PROP_ARRAY* props);
    void begin_design(const char* name, VX_PROP_ARRAY* props);
    void end_design();
    void add_alias(const char* name, const char* alias);
    void begin_block(const char* label, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props);
    void begin_prim(const char* type, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props);
    void end_block();
    void do_pin(const char* name, VX_PROP_ARRAY* props);
    void do_signal(const char* name, VX_SIGNAL_TYPE kind, VX_PROP_ARRAY* props);
    void do_mapsignal(const char* block, const char* pin, VX_PROP_ARRAY* props);
    void add_mapconn(const char* block, const char* pin, VX_PROP_ARRAY* props);

    // Property rules on reading.
    template <class Named>
    bool assign_name(Named* object, const VX_PROP& prop);
    void assign_hxb_prop(HX_OBJECT* object, const VX_PROP& prop, uint8_t on_pin);
    void do_design_props(HX_DESIGN* target, VX_PROP_ARRAY* props);
    void do_block_props(HX_BLOCK* block, VX_PROP_ARRAY* props);
    bool do_physical_flag(HX_BLOCK* block);
    void do_mapsignal_props(HX_MAPSIGNAL* map, VX_PROP_ARRAY* props);

    // Blocks, primitives and pins.
    bool start_block_statement(uint8_t physical_stmt);
    void begin_root_block(const char* label, uint16_t width, VX_PROP_ARRAY* props);
    HX_DESIGN* graft_source(const char* label);
    HX_BLOCK* create_prim(const char* keyword, int32_t type, uint16_t width);
    void begin_template_block(const char* label, uint16_t width, VX_PROP_ARRAY* props);
    void begin_grafted_block(HX_DESIGN* source, VX_PROP_ARRAY* props);
    HX_PIN* do_graft_pin(const char* name, VX_PROP_ARRAY* props);
    HX_PIN* do_prim_pin(HX_PRIMITIVE* prim, const char* name, VX_PROP_ARRAY* props);
    HX_PIN* do_plain_pin(const char* name, VX_PROP_ARRAY* props);
    bool adopt_existing_root(const char* label);
    void name_unnamed_pins();
    void parse_pending_pinrefs();
    HX_PHYSBLOCK* create_physroot(HX_BASELOGBLOCK* log_block);
    void reset_physpins();
    void add_physpin(const char* name, HX_PIN_TYPE direction);

    // Pin properties.
    void do_pin_props(HX_BLOCK* block, uint16_t index, VX_PROP_ARRAY* props);
    void do_primpin_props(HX_PRIMITIVE* prim, uint16_t index, VX_PROP_ARRAY* props);
    bool assign_signal(HX_BLOCK* block, uint16_t index, const VX_PROP& prop);
    void set_pin_type(HX_PIN* pin, const char* value);

    // Signals, map signals and merge records.
    void do_signal_props(HX_SIGNAL* signal, VX_PROP_ARRAY* props, uint8_t physical_kind);
    HX_NETWORK* find_net_by_name(const char* name, VX_SIGNAL_TYPE kind);
    void make_global(HX_SIGNAL*& signal, uint8_t physical_kind);
    void do_merge_prop(HX_SIGNAL* signal, const char* name, const char* value);
    HX_BLOCK* get_blk(HX_DESIGN* target, const char* name, uint8_t physical_kind);
    void resolve_merge_props();
    void resolve_design_merges(HX_DESIGN* target);
    void resolve_before_graft(HX_DESIGN* source);

    // Database to text: the top of the file and the library.
    void write_file_header();
    void write_library();
    VX_STATUS finish_write(const char* path, Port::ReplaceFile& out);
    bool is_an_input(const char* output) const;

    // Output layer: every byte of a written netlist passes through here.
    // An absent word of write_indent is a view without data.
    void write_string(const char* first, const char* second);
    void write_indent(int32_t count, std::string_view word1, std::string_view word2,
                      std::string_view word3 = {}, std::string_view word4 = {});
    void write_item(std::string_view item);
    void write_pair(std::string_view first, std::string_view second);
    void write_line_end();
    void write_joined(std::string_view bytes, bool pair);
    void end_line(std::string_view text);
    void break_before(std::size_t length, bool pair);
    void put_indent(int levels);
    void put(std::string_view bytes) {
        out_stream->write(bytes.data(), bytes.size());
        const int64_t next = static_cast<int64_t>(column) + static_cast<int64_t>(bytes.size());
        column = next > INT32_MAX ? INT32_MAX : static_cast<int32_t>(next);
    }
    void begin_construct();
    void end_construct();
    VX_LEGALNAME quote_kwd(const char* name);
    VX_LEGALNAME vrx_legal(const char* name, const void* object);
    void note_unreadable(std::string_view text);
    uint32_t invented_identity(const void* object);
    const char* build_hiername(HX_BLOCK* block);

    // Properties.
    void do_prop(const HX_PROPERTY* prop, uint8_t* opened, const HX_BLOCK* block);
    void note_foreign_kind(const HX_PROPERTY* prop);
    void write_props(const HX_OBJECT* object, uint8_t* opened);
    void write_prop_list(const HX_OBJECT* object, uint8_t* opened, const HX_BLOCK* block);
    uint8_t has_props(const HX_OBJECT* object);

    // Object headers and type names.
    const char* pin_type(const HX_PIN* pin);
    const char* prim_name(const HX_PRIMITIVE* prim, uint16_t index);
    void write_object_header(const char* keyword, const HX_OBJECT* object, const char* object_name,
                             std::string_view given_name, uint16_t number, uint8_t no_name,
                             uint8_t no_props);
    void write_blk_header(HX_BLOCK* block, uint8_t root, uint8_t pin_count);
    void write_prim_header(HX_PRIMITIVE* prim, uint8_t physical, uint8_t no_props);
    void write_user_flag(const HX_BLOCK* block);
    VX_LEGALNAME root_clash_label(const HX_BLOCK* block, const char* plain);

    // Pins.
    void write_root_pins(HX_BLOCK* block);
    void write_blk_pins(HX_BLOCK* block, uint8_t with_types);
    void write_prim_pins(HX_PRIMITIVE* prim);
    void write_pin_props(const HX_PIN* pin, const HX_BLOCK* block, uint8_t root,
                         uint8_t with_types);
    void write_primpin_props(const HX_PIN_PRIMITIVE* pin, const HX_BLOCK* block, uint8_t root);
    void write_blkpin_props(const HX_PIN* pin, const HX_BLOCK* block, uint8_t* opened);
    void write_entry(std::string_view head, std::string_view value, bool pair);

    // Signals and map signals.
    void write_signal_props(HX_BLOCK* block);
    std::string section_net_name(const HX_NETWORK* net) const;
    void write_map_signals(HX_BASEPHYSBLOCK* block);
    void write_pin_mapsignal(HX_BASEPHYSBLOCK* block, const HX_PIN* pin, const VX_LEGALNAME& label);
    void write_unmapped_children(HX_BASEPHYSBLOCK* block, std::optional<VX_LEGALNAME>& label);
    const VX_LEGALNAME& mapsignal_label(HX_BASEPHYSBLOCK* block,
                                        std::optional<VX_LEGALNAME>& label);

    // Design traversal.
    void write_design();
    void write_contents(HX_BLOCK* block, uint8_t physical);
    void traverse(HX_BLOCK* block, uint8_t physical);
    void write_child(HX_BLOCK* block, uint8_t physical);
    void write_root_design();
    void write_root_header(HX_BLOCK* root, uint8_t physical);

    // Library designs that another design writes as a section.
    std::unordered_map<std::string, HX_BLOCK*> library_sections();
    std::string section_key(std::string name) const;
    bool same_as_section(HX_DESIGN* candidate, HX_BLOCK* section);
    bool write_scratch_section(int fd, HX_DESIGN* owner, HX_BLOCK* block);

    // Writer state.
    int16_t indent;
    Port::Stream* out_stream;
    UT_PTRFILE* db_file;
    Hxb_PropFilter* prop_filter;
    int32_t column;
    uint8_t omit_user;
    // The block whose signal statements are being written: a net that a tag
    // property names is named as seen from its section.
    const HX_BLOCK* signal_section = nullptr;
    // Names written in this vrx_write that will not read back as they are.
    uint32_t unreadable_names = 0;
    std::string first_unreadable;
    uint32_t constructs_written = 0;  // counts toward the next progress report
    // Identities of the unnamed objects named so far in this vrx_write.
    std::unordered_map<const void*, uint32_t> invented_ids;
    // Set while a section is written only to be compared: its reports would
    // repeat those of the real text.
    bool scratch_write = false;
    const HX_BLOCK* scratch_top = nullptr;  // the block that such a section is written for
    // Reader state.
    uint8_t make_physroot;
    VX_PARSER_STATUS parser_status;
    VX_SIGNALCACHE log_signals;
    VX_SIGNALCACHE phys_signals;
    PM_PIC* picspec;
    HX_BLOCK* curr_block;
    uint16_t curr_indices[16];
    uint8_t pending_pinrefs;
    HX_MAPSIGNAL* curr_mapsignal;
    HX_BASEPHYSBLOCK* curr_mapparent;
    uint8_t grafting;
    uint8_t physical;
    char* first_input;
    // What the converter holds.
    uint8_t is_design;
    uint8_t nograft;
    bool all_findings = false;
    HX_LIBRARY* library;
    HX_DESIGN* design;
    HX_BASELOGBLOCK* log_root;
    HX_BASEPHYSBLOCK* phys_root;
    // The progress hook, and the step and file size it reports on.
    VX_PROGRESS_FN progress_fn = nullptr;
    void* progress_context = nullptr;
    std::string progress_what;
    uint64_t progress_total = 0;
    // Keyed lookups of the builder (blocks and networks by name, designs
    // holding merge records); made on first use, never copied.
    std::unique_ptr<VX_LOOKUPS> lookups;
};

/// The converter that the text reader's callbacks reach; null when none.
extern VRX* active_vrx;
