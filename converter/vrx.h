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

#include <cstdint>

#include "hx_design.h"
#include "hx_library.h"
#include "pm_device.h"
#include "port_file.h"
#include "ut_btr_tree.h"
#include "ut_ptrfile.h"
#include "vrx_parser.h"

class Hxb_PropFilter;

/// Result of the public conversion operations.
enum VX_STATUS : int32_t {
    VX_OK = 0,
    VX_FILE_ERROR = 1,   // a file could not be opened, read or written; a bad filter file
    VX_PARSE_ERROR = 2,  // a text file did not parse
    VX_DRC_ERROR = 3,    // the design-rule check after reading found errors
};

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
    /// signal caches are copied. A copy never becomes the active converter.
    VRX(const VRX& other);
    VRX& operator=(const VRX& other);

    HX_DESIGN* get_design() const { return design; }
    HX_LIBRARY* get_library() const { return library; }

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

    void init_curr_indices(uint16_t value);
    void set_parser_status(VX_PARSER_STATUS status);

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

    // Writer state.
    int16_t indent;
    Port::Stream* out_stream;
    UT_PTRFILE* db_file;
    Hxb_PropFilter* prop_filter;
    int32_t column;
    uint8_t omit_user;
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
    HX_LIBRARY* library;
    HX_DESIGN* design;
    HX_BASELOGBLOCK* log_root;
    HX_BASEPHYSBLOCK* phys_root;
};

/// The converter that the text reader's callbacks reach; null when none.
extern VRX* active_vrx;
