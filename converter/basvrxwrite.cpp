// Database to text: loading a design or library file, and writing it as a
// text netlist.
//
// vrx_write writes into a temporary file and copies it to the destination
// only when the whole file was written without error, so the destination
// holds either its former content or a complete netlist. Every failure
// removes the temporary file.
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <unordered_set>

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

// The temporary file of the write in progress. A fatal report that ends the
// process while it exists would leave it behind; the exit hook removes it.
std::string pending_temp;

void remove_pending_temp() {
    if (!pending_temp.empty()) std::remove(pending_temp.c_str());
}

void track_temp(const char* name) {
    static const bool hooked = std::atexit(remove_pending_temp) == 0;
    (void)hooked;
    pending_temp = name;
}

// Removes the temporary file and stops tracking it; false when it stays.
bool remove_temp(const char* temp_name) {
    pending_temp.clear();
    return Port::File::remove(temp_name);
}

// Closes the stream, removes the temporary file, forgets both.
void discard_output(Port::Stream*& stream, const char* temp_name) {
    delete stream;  // closes without reporting
    stream = nullptr;
    remove_temp(temp_name);
}

// Discards the output that a write left unfinished: one left by an exception
// (of the host's progress hook, or out of memory) on its way out.
class UnfinishedOutput {
  public:
    UnfinishedOutput(Port::Stream*& stream, const char* temp_name)
        : stream_(stream), temp_name_(temp_name) {}
    UnfinishedOutput(const UnfinishedOutput&) = delete;
    UnfinishedOutput& operator=(const UnfinishedOutput&) = delete;
    ~UnfinishedOutput() {
        if (stream_ != nullptr) discard_output(stream_, temp_name_);
    }

  private:
    Port::Stream*& stream_;
    const char* temp_name_;
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
        write_msg(__LINE__).issueError("cannot open input file '%s'\n", path);
        return VX_FILE_ERROR;
    }
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
                "input file '%s' is neither a design nor a library file\n", path);
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
    delete out_stream;
    out_stream = new Port::Stream(Port::ACCESS_WRITE, 4096);
    const char* temp = Port::File::tmpnam();
    if (temp == nullptr) {
        write_msg(__LINE__).issueError("cannot open temporary output file '%s'\n",
                                       "(no temporary file could be made)");
        delete out_stream;
        out_stream = nullptr;
        return VX_FILE_ERROR;
    }
    const std::unique_ptr<char[]> temp_name(UT_STR::Dup(temp));
    track_temp(temp_name.get());
    const UnfinishedOutput unfinished(out_stream, temp_name.get());
    if (Port::File::open(temp_name.get(), out_stream, true) == nullptr) {
        write_msg(__LINE__).issueError("cannot open temporary output file '%s'\n", temp_name.get());
        discard_output(out_stream, temp_name.get());
        return VX_FILE_ERROR;
    }
    if (filter_file != nullptr) {
        // A filter that fails to read replaces nothing: an earlier filter stays.
        Hxb_PropFiltStatus filter_status = HXB_PROPFILT_NOT_READ;
        auto filter = std::make_unique<Hxb_PropFilter>(filter_file, &filter_status, nullptr,
                                                       Hxb_PropFilter::FROM_DATABASE);
        if (filter_status != 3) {
            write_msg(__LINE__).issueError("error reading property filter file '%s'\n",
                                           filter_file);
            discard_output(out_stream, temp_name.get());
            return VX_FILE_ERROR;
        }
        delete prop_filter;
        prop_filter = filter.release();
    }
    write_msg(__LINE__).issueStatus("   writing VRX file '%s' ...\n", path);
    begin_progress("writing", path);

    indent = 0;
    column = 0;
    constructs_written = 0;
    unreadable_names = 0;
    first_unreadable.clear();
    vx_write_reset_fatal();
    write_file_header();
    if (is_design)
        write_design();
    else
        write_library();
    return finish_write(path, temp_name.get());
}

// Closes the temporary file and puts it in place when it is whole.
VX_STATUS VRX::finish_write(const char* path, const char* temp_name) {
    const int stream_error = out_stream->error();
    const bool closed = Port::File::close(out_stream);
    const int error = stream_error != 0 ? stream_error : out_stream->error();
    if (vx_write_fatal_seen()) {  // the report said why; the text is incomplete
        discard_output(out_stream, temp_name);
        return VX_FILE_ERROR;
    }
    if (!closed) {
        write_msg(__LINE__).issueError("error writing temporary output file '%s': %s\n", temp_name,
                                       std::strerror(error != 0 ? error : EIO));
        discard_output(out_stream, temp_name);
        return VX_FILE_ERROR;
    }
    report_write_progress(temp_name, true);
    if (unreadable_names > 0) {
        write_msg(__LINE__).issueWarning(
            "%u name(s) in '%s' will not read back as written (a double quote, a carriage "
            "return before a line feed, or more than 1024 bytes), the first '%.80s'\n",
            unreadable_names, path, first_unreadable.c_str());
    }
    if (!Port::File::copy(temp_name, path)) {
        write_msg(__LINE__).issueError("Unable to copy temporary file '%s' to '%s'.\n", temp_name,
                                       path);
        discard_output(out_stream, temp_name);
        return VX_FILE_ERROR;
    }
    delete out_stream;
    out_stream = nullptr;
    if (!remove_temp(temp_name)) {
        write_msg(__LINE__).issueError("Unable to remove temporary file '%s'.\n", temp_name);
        return VX_FILE_ERROR;
    }
    return VX_OK;
}

void VRX::write_file_header() {
    const UT_TIMESTAMP now;
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
// the designs that used them hold copies: a design whose name a section of
// another design will carry is left out, so that each name is defined once
// and the text reads back.
void VRX::write_library() {
    uint8_t opened = 0;
    if (library->get_casesense()) {
        write_entry(" (", "CASESENSE", false);
        opened = 1;
    }
    write_props(library, &opened);
    if (opened) write_string(")", "\r\n");
    std::unordered_set<std::string> sections;
    UT_BLIST_ITER<HX_LIBLINK>* links = library->create_liblink_iter();
    while (HX_LIBLINK* link = links->l_next())
        vx_section_names(*link->get_design(), sections);
    library->delete_liblink_iter(links);
    // Owned, so that an exception of the host's progress hook leaks nothing.
    const std::unique_ptr<UT_BLIST_ITER<HX_LIBLINK>> designs(library->create_liblink_iter());
    while (HX_LIBLINK* link = designs->l_next()) {
        design = link->get_design();
        if (sections.contains(vx_text(design->get_name()))) {
            write_msg(__LINE__).issueStatus(
                "   design %s is written as a section of another design\n",
                vx_text(design->get_name()));
            continue;
        }
        write_msg(__LINE__).issueStatus("   processing design %s ...\n",
                                        vx_text(design->get_name()));
        write_design();
    }
    for (const auto& [alias, target] : library->aliases()) {
        const VX_LEGALNAME name = vrx_legal(target->get_name(), target).keep();
        write_indent(3, "DESIGN", name.view(), vrx_legal(alias.c_str(), target).view());
        begin_construct();
        end_construct();
    }
}
