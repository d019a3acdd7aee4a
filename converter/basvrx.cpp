// The converter object: construction, copies, the active converter, the
// progress hook and the signal caches.
#include <algorithm>

#include "hxb_propfilter.h"
#include "port_msg.h"
#include "ut_str.h"
#include "vrx.h"
#include "vx_builder_internal.h"
#include "vx_text.h"

VRX* active_vrx = nullptr;

namespace {

constexpr uint16_t kNoIndex = 0xFFFF;

}  // namespace

// --- VRX -----------------------------------------------------------------------

VRX::VRX()
    : indent(0),
      out_stream(nullptr),
      db_file(nullptr),
      prop_filter(nullptr),
      column(0),
      omit_user(0),
      make_physroot(0),
      parser_status(VX_PARSER_OK),
      picspec(nullptr),
      curr_block(nullptr),
      pending_pinrefs(0),
      curr_mapsignal(nullptr),
      curr_mapparent(nullptr),
      grafting(0),
      physical(0),
      first_input(nullptr),
      is_design(0),
      nograft(0),
      library(nullptr),
      design(nullptr),
      log_root(nullptr),
      phys_root(nullptr),
      lookups(std::make_unique<VX_LOOKUPS>()) {
    if (active_vrx != nullptr) {
        Port_MsgManData::createObject("Quorra", "../s/basvrx", __LINE__, "$Revision: 1.2 $")
            .issueFatal(2, "multiple concurrent VX objects\n");
    }
    active_vrx = this;
    std::fill(std::begin(curr_indices), std::end(curr_indices), kNoIndex);
}

VRX::~VRX() {
    // Only the active converter may clear the pointer: destroying a copy
    // must leave the converter that the reader reaches in place.
    if (active_vrx == this) active_vrx = nullptr;
    release_owned();
}

VRX::VRX(const VRX& other)
    : log_signals(other.log_signals),
      phys_signals(other.phys_signals),
      lookups(std::make_unique<VX_LOOKUPS>()) {
    copy_from(other);
}

VRX& VRX::operator=(const VRX& other) {
    if (this == &other) return *this;
    release_owned();
    log_signals = other.log_signals;
    phys_signals = other.phys_signals;
    copy_from(other);
    return *this;
}

void VRX::release_owned() {
    delete[] first_input;
    first_input = nullptr;
    delete db_file;
    db_file = nullptr;
    delete prop_filter;
    prop_filter = nullptr;
    delete picspec;
    picspec = nullptr;
}

void VRX::copy_from(const VRX& other) {
    indent = other.indent;
    out_stream = nullptr;  // lives only during the source's own write
    db_file = nullptr;
    prop_filter = nullptr;
    column = other.column;
    omit_user = other.omit_user;
    make_physroot = other.make_physroot;
    parser_status = other.parser_status;
    picspec = nullptr;
    curr_block = other.curr_block;
    std::copy(std::begin(other.curr_indices), std::end(other.curr_indices),
              std::begin(curr_indices));
    pending_pinrefs = other.pending_pinrefs;
    curr_mapsignal = other.curr_mapsignal;
    curr_mapparent = other.curr_mapparent;
    grafting = other.grafting;
    physical = other.physical;
    first_input = other.first_input ? UT_STR::Dup(other.first_input) : nullptr;
    is_design = other.is_design;
    nograft = other.nograft;
    all_findings = other.all_findings;
    library = other.library;
    design = other.design;
    log_root = other.log_root;
    phys_root = other.phys_root;
    progress_fn = other.progress_fn;
    progress_context = other.progress_context;
}

void VRX::set_parser_status(VX_PARSER_STATUS status) {
    parser_status = status;
}

// --- progress ----------------------------------------------------------------------

void VRX::set_progress(VX_PROGRESS_FN fn, void* context) {
    progress_fn = fn;
    progress_context = context;
}

void VRX::begin_progress(const char* verb, const char* path) {
    if (progress_fn == nullptr) return;
    progress_what = verb;
    progress_what += ' ';
    progress_what += vx_text(path);
}

void VRX::forward_progress(void* self, uint64_t done, uint64_t total) {
    static_cast<const VRX*>(self)->report_progress(done, total);
}

void VRX::forward_scan_progress(void* self, uint64_t done) {
    const auto* vrx = static_cast<const VRX*>(self);
    vrx->report_progress(done, vrx->progress_total);
}
