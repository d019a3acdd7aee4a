// The converter object: construction, copies, the active converter, the
// progress hook and the signal caches.
#include <algorithm>
#include <cstdio>
#include <cstring>
#include <exception>
#include <new>

#include "hxb_propfilter.h"
#include "port_msg.h"
#include "ut_str.h"
#include "vrx.h"
#include "vx_builder_internal.h"
#include "vx_text.h"

VRX* active_vrx = nullptr;

namespace {

constexpr uint16_t kNoIndex = 0xFFFF;

Port_MsgManData converter_msg(int line) {
    return Port_MsgManData::createObject("Quorra", "../s/basvrx", line, "$Revision: 1.2 $");
}

// An exception of the host's progress hook on its way back to the host,
// past the library's own handlers (a host may throw std::bad_alloc too).
struct HostException {
    std::exception_ptr error;
};

// The reader's statements go to the converter that reads, a copy included,
// for the length of its read.
class ReaderTarget {
  public:
    explicit ReaderTarget(VRX* reader) : before_(active_vrx) { active_vrx = reader; }
    ReaderTarget(const ReaderTarget&) = delete;
    ReaderTarget& operator=(const ReaderTarget&) = delete;
    ~ReaderTarget() { active_vrx = before_; }

  private:
    VRX* before_;
};

}  // namespace

// --- the conversions ---------------------------------------------------------------

template <class Body>
VX_STATUS VRX::guarded(const char* doing, const char* path, VX_STATUS failed, Body&& body) {
    try {
        return body();
    } catch (const std::bad_alloc&) {
        abandon_files();
        report_out_of_memory(doing, path);
        return failed;
    } catch (const HostException& host) {
        abandon_files();
        std::rethrow_exception(host.error);
    }
}

VX_STATUS VRX::hxb_read(const char* path) {
    return guarded("loading", path, VX_FILE_ERROR, [&] { return load_database(path); });
}

VX_STATUS VRX::vrx_write(const char* path, const char* filter_file, uint8_t omit_user_flag) {
    return guarded("writing", path, VX_FILE_ERROR,
                   [&] { return write_text(path, filter_file, omit_user_flag); });
}

VX_STATUS VRX::vrx_read(const char* name, uint8_t design_flag, uint8_t physroot_flag,
                        uint8_t nograft_flag) {
    DARRAY_NAME names;
    names.add(name);
    return vrx_read(names, design_flag, physroot_flag, nograft_flag);
}

VX_STATUS VRX::vrx_read(const DARRAY_NAME& names, uint8_t design_flag, uint8_t physroot_flag,
                        uint8_t nograft_flag) {
    const ReaderTarget target(this);
    return guarded("building", nullptr, VX_PARSE_ERROR,
                   [&] { return read_texts(names, design_flag, physroot_flag, nograft_flag); });
}

VX_STATUS VRX::hxb_write(const char* path) {
    return guarded("storing", path, VX_FILE_ERROR, [&] { return store_database(path); });
}

// A database file left open by an exception: a write's temporary file goes.
void VRX::abandon_files() {
    if (db_file == nullptr || !db_file->is_open()) return;
    db_file->fail();
    Port::File::close(db_file);
}

// "out of memory while building design 'top'", "... storing library 'lib'
// in 'lib.hxl'": the design (or library) in hand, and the file. Composed
// without the heap, which may still be short; should the report itself run
// out, the exit handler is called all the same.
void VRX::report_out_of_memory(const char* doing, const char* path) const {
    const bool storing = std::strcmp(doing, "storing") == 0;
    const bool whole_library = storing ? !is_design : design == nullptr;
    const char* name = whole_library ? (library ? library->get_name() : nullptr)
                                     : (design ? design->get_name() : nullptr);
    if (std::strcmp(doing, "loading") == 0) name = nullptr;
    char subject[400] = "";
    if (name != nullptr)
        std::snprintf(subject, sizeof subject, " %s '%.300s'", whole_library ? "library" : "design",
                      name);
    char file[400] = "";
    if (path != nullptr)
        std::snprintf(file, sizeof file, "%s '%.300s'",
                      storing ? " in" : (std::strcmp(doing, "writing") == 0 ? " to" : ""), path);
    try {
        converter_msg(__LINE__).issueFatal(2, "out of memory while %s%s%s\n", doing, subject, file);
    } catch (const std::bad_alloc&) {
        Port_MsgDispatcher::exit(2);
    }
}

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
        converter_msg(__LINE__).issueFatal(2, "multiple concurrent VX objects\n");
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

void VRX::call_progress(uint64_t done, uint64_t total) const {
    try {
        progress_fn(progress_context, progress_what.c_str(), done, total);
    } catch (...) {
        throw HostException{std::current_exception()};
    }
}

void VRX::forward_progress(void* self, uint64_t done, uint64_t total) {
    static_cast<const VRX*>(self)->report_progress(done, total);
}

void VRX::forward_scan_progress(void* self, uint64_t done) {
    const auto* vrx = static_cast<const VRX*>(self);
    vrx->report_progress(done, vrx->progress_total);
}
