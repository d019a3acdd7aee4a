// Database to text: loading a design or library file, and writing it as a
// text netlist.
//
// vrx_write writes into a temporary file beside the destination and puts it
// in place only when the whole file was written without error, so the
// destination holds either its former content or a complete netlist. Every
// failure drops the temporary file.
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <memory>
#include <string>

#include "hx_file.h"
#include "hx_library.h"
#include "hxb_propfilter.h"
#include "port_file.h"
#include "port_msg.h"
#include "ut_str.h"
#include "ut_timestamp.h"
#include "vrx.h"
#include "vx_builder_internal.h"
#include "vx_progress_hooks.h"
#include "vx_write_internal.h"

namespace {

Port_MsgManData write_msg(int line) {
    return Port_MsgManData::createObject("Quorra", "../s/basvrxwrite", line, "$Revision: 1.1 $");
}

// A file whose first byte is printable text (or starts a byte-order mark) is
// taken for a text netlist given by mistake. Only a regular file is opened
// again to look: a pipe has been read.
bool looks_like_text(const char* path) {
    if (std::strcmp(path, "-") == 0 || !Port::regular_file_id(path, true)) return false;
    UT_PTRFILE file(Port::ACCESS_READ);
    unsigned char first = 0;
    if (Port::File::open(path, &file, true) == nullptr || file.read(&first, 1) != 1) return false;
    return first == 0xEF || first == '\t' || first == '\n' || first == '\r' ||
           (first >= 0x20 && first < 0x7F);
}

// The header's time: SOURCE_DATE_EPOCH in UTC when it is set, so that two runs
// give the same bytes; else now, in local time.
UT_TIMESTAMP header_time() {
    const char* epoch = std::getenv("SOURCE_DATE_EPOCH");
    if (epoch == nullptr || *epoch == '\0') return UT_TIMESTAMP();
    char* end = nullptr;
    errno = 0;
    const long long seconds = std::strtoll(epoch, &end, 10);
    if (errno != 0 || *end != '\0' || seconds < 0) {
        write_msg(__LINE__).issueWarning(
            "SOURCE_DATE_EPOCH '%s' is not a count of seconds; the current time is written\n",
            epoch);
        return UT_TIMESTAMP();
    }
    return UT_TIMESTAMP(static_cast<std::time_t>(seconds), UT_TIMESTAMP::UTC);
}

// Drops the stream of a write left unfinished by an exception (of the host's
// progress hook, or out of memory) on its way out; the destination's own
// guard removes the temporary file.
class UnfinishedOutput {
  public:
    explicit UnfinishedOutput(Port::Stream*& stream) : stream_(stream) {}
    UnfinishedOutput(const UnfinishedOutput&) = delete;
    UnfinishedOutput& operator=(const UnfinishedOutput&) = delete;
    ~UnfinishedOutput() {
        delete stream_;
        stream_ = nullptr;
    }

  private:
    Port::Stream*& stream_;
};

}  // namespace

// --- hxb_read ----------------------------------------------------------------------

VX_STATUS VRX::load_database(const char* path) {
    if (path == nullptr || *path == '\0') {
        write_msg(__LINE__).issueError("cannot open input file '%s'\n", "");
        return VX_FILE_ERROR;
    }
    lookups = std::make_unique<VX_LOOKUPS>();  // what a text read left behind
    delete db_file;
    db_file = new UT_PTRFILE(Port::ACCESS_READ);
    if (Port::File::open(path, db_file, true) == nullptr) {
        const int error = errno;
        if (error == EISDIR)
            write_msg(__LINE__).issueError("cannot open input file '%s': '%s' is a directory\n",
                                           path, path);
        else
            write_msg(__LINE__).issueError("cannot open input file '%s': %s\n", path,
                                           std::strerror(error));
        return VX_FILE_ERROR;
    }
    if (const auto id = Port::regular_file_id(path, true)) lookups->inputs.push_back({*id, path});
    VX_STATUS status = VX_OK;
    begin_progress("reading", path);
    const VX_PROGRESS_HOOKS_OFF hooks_off;
    if (progress_fn != nullptr) HX_FILE_IO::set_progress(forward_progress, this);
    switch (hx_env.get_file_type(db_file)) {
        case HX_FILE_DESIGN:
            write_msg(__LINE__).issueStatus("   reading design from '%s' ...\n", path);
            if (HX_DESIGN* read = hx_env.create_design(db_file, 0)) {
                design = read;
                is_design = 1;
            } else {
                status = VX_FILE_ERROR;  // the database has said why
            }
            break;
        case HX_FILE_LIBRARY:
            write_msg(__LINE__).issueStatus("   reading library from '%s' ...\n", path);
            if (HX_LIBRARY* read = hx_env.create_library(db_file)) {
                library = read;
                is_design = 0;
            } else {
                status = VX_FILE_ERROR;
            }
            break;
        default:
            write_msg(__LINE__).issueError(
                "input file '%s' is neither a design nor a library file%s\n", path,
                looks_like_text(path) ? " (it holds text: a VRX netlist is converted by vrx2hxb)"
                                      : "");
            status = VX_FILE_ERROR;
            break;
    }
    Port::File::close(db_file);
    return status;
}

// --- vrx_write ---------------------------------------------------------------------

VX_STATUS VRX::write_text(const char* path, const char* filter_file, uint8_t omit_user_flag) {
    omit_user = omit_user_flag;
    if ((is_design ? static_cast<void*>(design) : static_cast<void*>(library)) == nullptr) {
        write_msg(__LINE__).issueError("no design or library has been read to write to '%s'\n",
                                       vx_text(path));
        return VX_FILE_ERROR;
    }
    if (path == nullptr || *path == '\0') {
        write_msg(__LINE__).issueError("no output file name given\n");
        return VX_FILE_ERROR;
    }
    if (is_an_input(path)) return VX_FILE_ERROR;
    if (filter_file != nullptr) {
        // A filter that fails to read replaces nothing: an earlier filter stays.
        Hxb_PropFiltStatus filter_status = HXB_PROPFILT_NOT_READ;
        auto filter = std::make_unique<Hxb_PropFilter>(filter_file, &filter_status, nullptr,
                                                       Hxb_PropFilter::FROM_DATABASE);
        if (filter_status != 3) {
            write_msg(__LINE__).issueError("error reading property filter file '%s'\n",
                                           filter_file);
            return VX_FILE_ERROR;
        }
        delete prop_filter;
        prop_filter = filter.release();
    }
    // The text is written once, beside the destination, and put in place whole.
    Port::ReplaceFile out;
    if (!out.create(path)) {
        const int error = errno;
        write_msg(__LINE__).issueError("cannot open temporary output file '%s': %s\n", path,
                                       std::strerror(error));
        return VX_FILE_ERROR;
    }
    delete out_stream;
    out_stream = new Port::Stream(Port::ACCESS_WRITE, 4096);
    out_stream->attach(out.fd(), out.temp_name().c_str(), false);
    const UnfinishedOutput unfinished(out_stream);
    write_msg(__LINE__).issueStatus("   writing VRX file '%s' ...\n", path);
    begin_progress("writing", path);

    indent = 0;
    column = 0;
    constructs_written = 0;
    unreadable_names = 0;
    first_unreadable.clear();
    invented_ids.clear();
    vx_write_reset_fatal();
    write_file_header();
    if (is_design)
        write_design();
    else
        write_library();
    const VX_STATUS status = finish_write(path, out);
    std::unordered_map<const void*, uint32_t>().swap(invented_ids);
    return status;
}

// Puts the written text in place when it is whole; else drops it.
VX_STATUS VRX::finish_write(const char* path, Port::ReplaceFile& out) {
    const bool flushed = out_stream->detach();
    const int error = out_stream->error();
    const std::string shown = out.temp_name();
    if (vx_write_fatal_seen()) {  // the report said why; the text is incomplete
        delete out_stream;
        out_stream = nullptr;
        return VX_FILE_ERROR;
    }
    if (!flushed) {
        write_msg(__LINE__).issueError("error writing temporary output file '%s': %s\n",
                                       shown.c_str(), std::strerror(error != 0 ? error : EIO));
        delete out_stream;
        out_stream = nullptr;
        return VX_FILE_ERROR;
    }
    report_write_progress(true);
    delete out_stream;
    out_stream = nullptr;
    if (unreadable_names > 0) {
        write_msg(__LINE__).issueWarning(
            "%u name(s) in '%s' will not read back as written (a double quote, a carriage "
            "return before a line feed, more than 1024 bytes, a float that is not finite, or a "
            "value of another kind than its property's name takes), the first '%.80s'\n",
            unreadable_names, path, first_unreadable.c_str());
    }
    if (!out.commit()) {
        const int failure = errno;
        write_msg(__LINE__).issueError("Unable to copy temporary file '%s' to '%s': %s\n",
                                       shown.c_str(), path, std::strerror(failure));
        return VX_FILE_ERROR;
    }
    return VX_OK;
}

// An output that is one of the files read would destroy what it is made from.
bool VRX::is_an_input(const char* output) const {
    const auto id = Port::regular_file_id(output, false);
    if (!id) return false;
    for (const VX_INPUT_FILE& input : lookups->inputs) {
        if (input.id != *id) continue;
        write_msg(__LINE__).issueError(
            "output file '%s' is the same file as input file '%s'; nothing was written\n", output,
            input.name.c_str());
        return true;
    }
    return false;
}

void VRX::write_file_header() {
    const UT_TIMESTAMP now = header_time();
    const std::string stamp = UT_STR::Format(
        "%s:%s:%s, %s %s, %s.", now.get_ts_hour(), now.get_ts_minute(), now.get_ts_second(),
        now.get_ts_monthst(), now.get_ts_mday(), now.get_ts_year());
    const std::string line = UT_STR::Format("// Created %s by Vondrel package hxb2vrx: Version %s",
                                            stamp.c_str(), "Quillate");
    write_string(line.c_str(), "\r\n");
    write_string("// $Header: basvrxwrite,v 1.1 2003/01/23 19:53:39 Exp $", "\r\n");
}

// The library's case-sense flag and aliases are written too (CASESENSE in
// its property list, one alias statement per alias after the designs), so
// that reading the text back gives a library that finds the same designs.
//
// A library read from text holds a design for every section of its text, and
// the designs that used them hold copies: a design that a section of another
// design will define as it is, is left out, so that each name is defined once
// and the text reads back. One that differs from that section is written all
// the same, with a warning: dropping it would lose it.
void VRX::write_library() {
    if (library->design_count() == 0)
        write_msg(__LINE__).issueWarning(
            "library %s holds no design; text cannot hold an empty library, so the text written "
            "will not read back\n",
            vx_text(library->get_name()));
    uint8_t opened = 0;
    if (library->get_casesense()) {
        write_entry(" (", "CASESENSE", false);
        opened = 1;
    }
    write_props(library, &opened);
    if (opened) write_string(")", "\r\n");
    const std::unordered_map<std::string, HX_BLOCK*> sections = library_sections();
    // Owned, so that an exception of the host's progress hook leaks nothing.
    const std::unique_ptr<UT_BLIST_ITER<HX_LIBLINK>> designs(library->create_liblink_iter());
    while (HX_LIBLINK* link = designs->l_next()) {
        design = link->get_design();
        const char* name = vx_text(design->get_name());
        const auto section = sections.find(section_key(name));
        if (section != sections.end()) {
            if (same_as_section(design, section->second)) {
                write_msg(__LINE__).issueStatus(
                    "   design %s is written as a section of another design\n", name);
                continue;
            }
            write_msg(__LINE__).issueWarning(
                "design %s differs from the section of design %s written under the same name: "
                "the text holds two designs of that name and will not read back as written\n",
                name, vx_text(section->second->get_design()->get_name()));
        }
        write_msg(__LINE__).issueStatus("   processing design %s ...\n", name);
        write_design();
    }
    for (const auto& [alias, target] : library->aliases()) {
        const VX_LEGALNAME name = vrx_legal(target->get_name(), target).keep();
        write_indent(3, "DESIGN", name.view(), vrx_legal(alias.c_str(), target).view());
        begin_construct();
        end_construct();
    }
}
