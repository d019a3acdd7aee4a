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
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <memory>
#include <string>
#include <system_error>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

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

// Findings of each design-rule check printed unless all are asked for.
constexpr int kShownFindings = 20;

Port_MsgManData read_msg(int line) {
    return Port_MsgManData::createObject("Quorra", "../s/basvxread", line, "$Revision: 1.2 $");
}

// The scanner's input for one file ("-": standard input); closed and taken
// back from the scanner on every way out. A directory or a database file is
// refused before the scanner sees it.
class InputFile {
  public:
    enum Kind { TEXT, UNREADABLE, DIRECTORY, DATABASE };

    explicit InputFile(const char* path) : file_(open_stream(path)) {
        if (file_ == nullptr) {
            error_ = errno;
            return;
        }
        struct stat st;
        if (::fstat(fileno(file_), &st) == 0 && S_ISDIR(st.st_mode)) {
            kind_ = DIRECTORY;
        } else if (const int first = std::getc(file_); first == kDatabaseByte) {
            kind_ = DATABASE;
        } else if (first != EOF) {
            std::ungetc(first, file_);
        }
        if (kind_ == TEXT) vrx_set_input(file_);
    }
    ~InputFile() {
        if (file_ == nullptr) return;
        if (kind_ == TEXT) vrx_set_input(nullptr);
        std::fclose(file_);
    }
    InputFile(const InputFile&) = delete;
    InputFile& operator=(const InputFile&) = delete;
    Kind kind() const { return file_ == nullptr ? UNREADABLE : kind_; }
    int error() const { return error_; }

  private:
    // Design and library files begin with this byte, which no text does.
    static constexpr int kDatabaseByte = 0x89;

    static std::FILE* open_stream(const char* path) {
        if (std::strcmp(path, "-") != 0) return std::fopen(path, "re");
        const int fd = ::fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3);
        std::FILE* stream = fd >= 0 ? ::fdopen(fd, "r") : nullptr;
        if (stream == nullptr && fd >= 0) ::close(fd);
        return stream;
    }

    std::FILE* file_;
    Kind kind_ = TEXT;
    int error_ = 0;
};

// Says why an input cannot be read as text.
bool usable(const InputFile& input, const char* path) {
    switch (input.kind()) {
        case InputFile::TEXT:
            return true;
        case InputFile::UNREADABLE:
            read_msg(__LINE__).issueError("cannot open input file %s: %s\n", path,
                                          std::strerror(input.error()));
            return false;
        case InputFile::DIRECTORY:
            read_msg(__LINE__).issueError("cannot open input file %s: %s is a directory\n", path,
                                          path);
            return false;
        case InputFile::DATABASE:
            read_msg(__LINE__).issueError(
                "input file %s is a design or library file, not a VRX text netlist (hxb2vrx "
                "converts it)\n",
                path);
            return false;
    }
    return false;
}

// "-" and a directory (refused as such) keep their name; another name
// without an extension gets ".vrx".
bool takes_name_as_given(const char* name) {
    struct stat st;
    return UT_PATH::GetExt(name) != nullptr || std::strcmp(name, "-") == 0 ||
           (::stat(name, &st) == 0 && S_ISDIR(st.st_mode));
}

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
    if (is_design && design != nullptr) warn_unused_designs();
    return check() ? VX_OK : VX_DRC_ERROR;
}

VX_STATUS VRX::read_one_file(const char* name) {
    const std::string path =
        takes_name_as_given(name) ? std::string(name) : UT_STR::Format("%s.vrx", name);
    const InputFile input(path.c_str());
    if (!usable(input, path.c_str())) return VX_FILE_ERROR;
    if (const auto id = Port::regular_file_id(path.c_str(), true))
        lookups->inputs.push_back({*id, path});
    read_msg(__LINE__).issueStatus("reading VRX file %s ...\n", path.c_str());
    parser_status = VX_PARSER_OK;
    lookups->designs_before_file = library->design_count();
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

namespace {

// The designs grafted into `top`, directly or through other grafts, and top.
std::unordered_set<const HX_DESIGN*> parts_of(
    const HX_DESIGN* top,
    const std::vector<std::pair<const HX_DESIGN*, const HX_DESIGN*>>& grafts) {
    std::unordered_multimap<const HX_DESIGN*, const HX_DESIGN*> uses(grafts.begin(), grafts.end());
    std::unordered_set<const HX_DESIGN*> parts{top};
    std::vector<const HX_DESIGN*> todo{top};
    while (!todo.empty()) {
        const auto [first, last] = uses.equal_range(todo.back());
        todo.pop_back();
        for (auto it = first; it != last; ++it) {
            if (parts.insert(it->second).second) todo.push_back(it->second);
        }
    }
    return parts;
}

// "'a', 'b', 'c' and 2 more": the first few names of a list.
std::string first_names(const std::vector<const char*>& names) {
    constexpr std::size_t kNamed = 3;
    std::string text;
    for (std::size_t i = 0; i < names.size() && i < kNamed; ++i)
        text += UT_STR::Format("%s'%s'", i == 0 ? "" : ", ", vx_text(names[i]));
    if (names.size() > kNamed) text += UT_STR::Format(" and %zu more", names.size() - kNamed);
    return text;
}

}  // namespace

// In design mode only the last design is stored; every earlier design of a
// complete text is part of it. One that is not was read for nothing, which
// is what a text cut at a design boundary looks like. Earlier files may hold
// cell libraries of which a design uses a few: only the designs of the
// stored design's own file are looked at.
void VRX::warn_unused_designs() const {
    const std::unordered_set<const HX_DESIGN*> parts = parts_of(design, lookups->grafts);
    std::vector<const char*> unused;
    std::size_t position = 0;
    UT_BLIST_ITER<HX_LIBLINK>* iter = library->create_liblink_iter();
    while (const HX_LIBLINK* link = iter->l_next()) {
        const bool same_file = position++ >= lookups->designs_before_last_design_file;
        if (same_file && parts.count(link->get_design()) == 0)
            unused.push_back(link->get_design()->get_name());
    }
    library->delete_liblink_iter(iter);
    if (unused.empty()) return;
    read_msg(__LINE__).issueWarning(
        "%zu %s not part of the stored design '%s' (neither grafted nor instantiated into it): "
        "%s; the input may be cut short\n",
        unused.size(), unused.size() == 1 ? "design read is" : "designs read are",
        vx_text(design->get_name()), first_names(unused).c_str());
}

bool VRX::check() {
    Hxb_DRC drc;
    drc.setCheck(Hxb_DRC::CHECK_UNDRIVEN_NET, Hxb_DRC::STATUS_WARNING);
    drc.setCheck(Hxb_DRC::CHECK_UNCONNECTED_PIN, Hxb_DRC::STATUS_WARNING);
    // Real netlists can have thousands of findings of one kind.
    if (!all_findings)
        drc.setReportLimit(kShownFindings,
                           "vrx2hxb --all-findings (VRX::set_all_findings) shows them all");
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

// "-" and an existing device, FIFO or socket are written as named.
bool written_as_named(const char* path) {
    struct stat st;
    return std::strcmp(path, "-") == 0 ||
           (::stat(path, &st) == 0 && !S_ISREG(st.st_mode) && !S_ISDIR(st.st_mode));
}

// The output name: `path`, or the first input without its extension; the
// extension is made the one of what is written.
bool output_name(const char* path, const char* first_input, const char* extension,
                 std::string& out) {
    if (path != nullptr && *path != '\0' && written_as_named(path)) {
        out = path;
        return true;
    }
    if (path != nullptr && *path != '\0')
        out = path;
    else if (path == nullptr && first_input != nullptr && *first_input != '\0' &&
             std::strcmp(first_input, "-") != 0)
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
    if (path != nullptr && UT_PATH::GetExt(path) != nullptr && out != path) {
        read_msg(__LINE__).issueWarning(
            "output file %s is written as %s, with the extension of its kind\n", path, out.c_str());
    }
    if (is_an_input(out.c_str())) return VX_FILE_ERROR;
    resolve_merge_props();  // records of a file that failed to parse
    delete db_file;
    db_file = new UT_PTRFILE(Port::ACCESS_WRITE);
    if (Port::File::open(out.c_str(), db_file, true) == nullptr) {
        read_msg(__LINE__).issueError("cannot open output file %s: %s\n", out.c_str(),
                                      std::strerror(errno));
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
        read_msg(__LINE__).issueError("error writing output file %s: %s\n", out.c_str(),
                                      std::strerror(errno != 0 ? errno : EIO));
        return VX_FILE_ERROR;
    }
    return written ? VX_OK : VX_FILE_ERROR;
}
