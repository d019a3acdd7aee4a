// vrx2hxb: reads VRX text netlists and stores the result as a design (.hxb)
// or library (.hxl) file.
//
//   vrx2hxb [-l | --library] [-p | --physroot] [-n | --nograft] [-o FILE | --output FILE]
//           [-a | --all-findings] [-q | --quiet] INPUT...
//
// The inputs are read in order into one library. Without -l the last design
// they define is stored, with -l the whole library. Messages go through the
// message manager's default sink: status lines on standard output,
// everything else on standard error; -q drops the status lines. On a
// terminal, standard error also shows the progress of each step
// (tool_progress.h).
//
// A file or parse error leaves no database file: what was read is
// incomplete. A design-rule error does not stop the write (the design is
// complete, and the file is what one inspects to find the fault), but the
// exit status still says 3. The exit status is the VX_STATUS of the first
// step that failed, 0 when all succeeded, 2 after a fatal report (which ends
// the run), or 64 for a usage error.
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "tool_args.h"
#include "tool_progress.h"
#include "ut_darray.h"
#include "vrx.h"

namespace {

enum OptionId { kLibrary, kPhysroot, kNograft, kOutput, kAllFindings, kQuiet };

// clang-format off
constexpr vrx_tool::Option kOptions[] = {
    {kLibrary, 'l', "library", false},
    {kPhysroot, 'p', "physroot", false},
    {kNograft, 'n', "nograft", false},
    {kOutput, 'o', "output", true},
    {kAllFindings, 'a', "all-findings", false},
    {kQuiet, 'q', "quiet", false},
};
// clang-format on

constexpr vrx_tool::ToolInfo kInfo = {
    "vrx2hxb",
    VRX_VERSION,
    "[-l | --library] [-p | --physroot] [-n | --nograft] [-o FILE | --output FILE]"
    " [-a | --all-findings] [-q | --quiet] INPUT...",
    "\n"
    "Reads the VRX text netlists INPUT..., in order, into one library and stores the last\n"
    "design they define as a design file (.hxb), or with -l the whole library as a library\n"
    "file (.hxl). An INPUT without an extension is read with \".vrx\" added. The output is\n"
    "named after the first INPUT unless -o names it; its extension is set to .hxb or .hxl.\n"
    "\"-\" as INPUT reads standard input (name the output with -o then); \"-o -\" writes\n"
    "standard output, and a device or FIFO is written in place under its own name. An\n"
    "output that is one of the inputs is refused.\n"
    "No output is written after a file or parse error; after design-rule errors it is.\n"
    "On a terminal, standard error shows how far each step has come.\n"
    "\n"
    "Options:\n"
    "  -l, --library      store the whole library instead of the last design\n"
    "  -p, --physroot     derive a physical root for designs whose logical root is PHYSICAL\n"
    "  -n, --nograft      with -l, keep designs from being grafted into each other\n"
    "  -o, --output FILE  write the database file FILE\n"
    "  -a, --all-findings\n"
    "                     print every finding of the design-rule check, not only the\n"
    "                     first 20 of each kind\n"
    "  -q, --quiet        print neither status lines nor progress; only warnings and errors\n"
    "      --help         print this help and exit\n"
    "      --version      print the version and exit\n"
    "\n"
    "Exit status:\n"
    "  0   success\n"
    "  1   a file could not be opened, read or written\n"
    "  2   an input did not parse, or a fatal error\n"
    "  3   the design-rule check found errors (the output is written all the same)\n"
    "  64  usage error\n",
    1,
    SIZE_MAX,
};

struct Settings {
    uint8_t library = 0;
    uint8_t physroot = 0;
    uint8_t nograft = 0;
    const char* output = nullptr;
    bool all_findings = false;
    bool quiet = false;
    DARRAY_NAME inputs;
};

Settings settings_from(const vrx_tool::CommandLine& line) {
    Settings settings;
    for (const vrx_tool::GivenOption& option : line.options) {
        switch (option.id) {
            case kLibrary:
                settings.library = 1;
                break;
            case kPhysroot:
                settings.physroot = 1;
                break;
            case kNograft:
                settings.nograft = 1;
                break;
            case kOutput:
                settings.output = option.argument;  // the last one given counts
                break;
            case kAllFindings:
                settings.all_findings = true;
                break;
            case kQuiet:
                settings.quiet = true;
                break;
        }
    }
    for (const char* operand : line.operands)
        settings.inputs.add(operand);
    return settings;
}

int convert(const Settings& settings) {
    const bool to_stdout = settings.output != nullptr && std::strcmp(settings.output, "-") == 0;
    vrx_tool::ProgressLine* progress = vrx_tool::set_up_output(settings.quiet, to_stdout);
    VRX vrx;
    if (progress != nullptr) vrx.set_progress(vrx_tool::ProgressLine::report, progress);
    vrx.set_all_findings(settings.all_findings);
    const VX_STATUS read = vrx.vrx_read(settings.inputs, settings.library ? 0 : 1,
                                        settings.physroot, settings.nograft);
    if (progress != nullptr) progress->clear();
    if (read != VX_OK && read != VX_DRC_ERROR) return read;
    const VX_STATUS written = vrx.hxb_write(settings.output);
    if (progress != nullptr) progress->clear();
    return read != VX_OK ? read : written;
}

}  // namespace

int main(int argc, char** argv) {
    const vrx_tool::CommandLine line = vrx_tool::parse_command_line(argc, argv, kOptions, kInfo);
    if (line.exit_status) return *line.exit_status;
    Port::guard_temporary_files();
    return convert(settings_from(line));
}
