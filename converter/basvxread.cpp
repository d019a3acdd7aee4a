// Text to database: reading text netlists into a new library, the
// design-rule check after reading, and storing the result as a database file.
//
// Choices beyond the bare steps, made so that nothing is lost or written
// wrongly:
//  - Each vrx_read starts without a design: a read whose text defines none
//    leaves nothing for hxb_write to store in design mode, instead of the
//    design of an earlier read.
//  - Merge records are resolved for every design of a file, not only the
//    last; records left by a file that failed to parse are resolved (or
//    reported and dropped) by hxb_write, so none reaches a database file.
//  - hxb_write checks the database write and the close; the destination is
//    replaced only by a complete file.
#include <cstdio>
#include <filesystem>
#include <memory>
#include <string>
#include <system_error>

#include "hx_file.h"
#include "hx_library.h"
#include "hxb_drc.h"
#include "port_file.h"
#include "port_msg.h"
#include "ut_path.h"
#include "ut_str.h"
#include "vrx.h"
#include "vx_builder_internal.h"
#include "vx_progress_hooks.h"

namespace {

Port_MsgManData read_msg(int line) {
    return Port_MsgManData::createObject("Quorra", "../s/basvxread", line, "$Revision: 1.2 $");
}

// The scanner's input for one file; closed and taken back from the scanner
// on every way out.
class InputFile {
  public:
    explicit InputFile(const char* path) : file_(std::fopen(path, "r")) {
        if (file_ != nullptr) vrx_set_input(file_);
    }
    ~InputFile() {
        if (file_ == nullptr) return;
        vrx_set_input(nullptr);
        std::fclose(file_);
    }
    InputFile(const InputFile&) = delete;
    InputFile& operator=(const InputFile&) = delete;
    bool is_open() const { return file_ != nullptr; }

  private:
    std::FILE* file_;
};

// 0 when the size is not known (a pipe, say).
uint64_t file_size(const char* path) {
    std::error_code error;
    const std::uintmax_t size = std::filesystem::file_size(path, error);
    return error ? 0 : static_cast<uint64_t>(size);
}

}  // namespace

VX_STATUS VRX::read_texts(const DARRAY_NAME& names, uint8_t design_flag, uint8_t physroot_flag,
                          uint8_t nograft_flag) {
    is_design = design_flag;
    make_physroot = physroot_flag;
    nograft = nograft_flag;
    if (names.count() == 0 || names[0] == nullptr) {
        read_msg(__LINE__).issueError("no input file given to read\n");
        return VX_FILE_ERROR;
    }
    const std::unique_ptr<const char*, void (*)(void*)> list(names.a_makearray(), von_free);
    std::string library_name;
    UT_PATH::GetBase(list.get()[0], library_name);
    library = hx_env.create_library(library_name.c_str(), 0);
    design = nullptr;
    log_root = nullptr;
    phys_root = nullptr;
    curr_block = nullptr;
    curr_mapsignal = nullptr;
    curr_mapparent = nullptr;
    lookups = std::make_unique<VX_LOOKUPS>();
    reset_physpins();  // a read that stopped inside a design left its pins
    delete[] first_input;
    first_input = UT_STR::Dup(list.get()[0]);

    VX_STATUS result = VX_OK;
    for (int32_t i = 0; i < names.count() && result == VX_OK; ++i)
        result = read_one_file(list.get()[i] ? list.get()[i] : "");
    if (result != VX_OK) return result;
    return check() ? VX_OK : VX_DRC_ERROR;
}

VX_STATUS VRX::read_one_file(const char* name) {
    const std::string path =
        UT_PATH::GetExt(name) != nullptr ? std::string(name) : UT_STR::Format("%s.vrx", name);
    const InputFile input(path.c_str());
    if (!input.is_open()) {
        read_msg(__LINE__).issueError("cannot open input file %s\n", path.c_str());
        return VX_FILE_ERROR;
    }
    read_msg(__LINE__).issueStatus("reading VRX file %s ...\n", path.c_str());
    parser_status = VX_PARSER_OK;
    vrx_parse_init();
    progress_total = file_size(path.c_str());
    begin_progress("reading", path.c_str());
    const VX_PROGRESS_HOOKS_OFF hooks_off;
    if (progress_fn != nullptr) vrx_set_scan_progress(forward_scan_progress, this);
    if (vrx_parse() != 0 || parser_status != VX_PARSER_OK) {
        read_msg(__LINE__).issueError("parse of input file failed\n");
        return VX_PARSE_ERROR;
    }
    resolve_merge_props();
    return VX_OK;
}

bool VRX::check() {
    Hxb_DRC drc;
    drc.setCheck(Hxb_DRC::CHECK_UNDRIVEN_NET, Hxb_DRC::STATUS_WARNING);
    drc.setCheck(Hxb_DRC::CHECK_UNCONNECTED_PIN, Hxb_DRC::STATUS_WARNING);
    // A text without any design leaves nothing to check in design mode.
    if (is_design && design == nullptr) return true;
    const int status = is_design ? drc.run(design) : drc.run(library);
    switch (status) {
        case 0:
            read_msg(__LINE__).issueStatus("DRC complete\n");
            return true;
        case 1:
            read_msg(__LINE__).issueWarning("DRC complete with %d warnings\n",
                                            drc.getNumWarnings());
            return true;
        case 2:
            read_msg(__LINE__).issueError("DRC failed with %d errors and %d warnings\n",
                                          drc.getNumErrors(), drc.getNumWarnings());
            return false;
        default:
            return true;
    }
}

namespace {

// The output name: `path`, or the first input without its extension; the
// extension is made the one of what is written.
bool output_name(const char* path, const char* first_input, const char* extension,
                 std::string& out) {
    if (path != nullptr && *path != '\0')
        out = path;
    else if (path == nullptr && first_input != nullptr && *first_input != '\0')
        UT_PATH::GetRoot(first_input, out);
    else
        return false;
    const char* current = UT_PATH::GetExt(out.c_str());
    if (current == nullptr) {
        out += '.';
        out += extension;
    } else if (UT_STR::Compare(current, extension) != 0) {
        out.resize(static_cast<std::size_t>(current - out.c_str()));
        out += extension;
    }
    return true;
}

}  // namespace

VX_STATUS VRX::store_database(const char* path) {
    std::string out;
    if (!output_name(path, first_input, is_design ? "hxb" : "hxl", out)) {
        read_msg(__LINE__).issueError(
            "no output file name given, and no input file has been read to name it after\n");
        return VX_FILE_ERROR;
    }
    if ((is_design ? static_cast<void*>(design) : static_cast<void*>(library)) == nullptr) {
        read_msg(__LINE__).issueError("no design or library has been read to write to '%s'\n",
                                      out.c_str());
        return VX_FILE_ERROR;
    }
    resolve_merge_props();  // records of a file that failed to parse
    delete db_file;
    db_file = new UT_PTRFILE(Port::ACCESS_WRITE);
    if (Port::File::open(out.c_str(), db_file, true) == nullptr) {
        read_msg(__LINE__).issueError("cannot open output file %s\n", out.c_str());
        return VX_FILE_ERROR;
    }
    read_msg(__LINE__).issueStatus("writing %s ...\n", out.c_str());
    begin_progress("writing", out.c_str());
    const VX_PROGRESS_HOOKS_OFF hooks_off;
    if (progress_fn != nullptr) HX_FILE_IO::set_progress(forward_progress, this);
    const bool written =
        is_design ? hx_env.write_design(db_file, design) : hx_env.write_library(db_file, library);
    if (!written) db_file->fail();  // the database has said why
    if (!Port::File::close(db_file) && written) {
        read_msg(__LINE__).issueError("error writing output file %s\n", out.c_str());
        return VX_FILE_ERROR;
    }
    return written ? VX_OK : VX_FILE_ERROR;
}
