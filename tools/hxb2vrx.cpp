// hxb2vrx: writes a design (.hxb) or library (.hxl) file as a VRX text netlist.
//
//   hxb2vrx [-f FILE | --filter FILE] [-u | --omit-user] [-q | --quiet] INPUT OUTPUT
//
// Messages go through the message manager's default sink: status lines on
// standard output, everything else on standard error; -q drops the status
// lines. On a terminal, standard error also shows the progress of each step
// (tool_progress.h).
// The exit status is the VX_STATUS of the first step that failed, 0 when
// both succeeded, 2 after a fatal report (which ends the run), or 64 for a
// usage error.
#include <cstdint>
#include <cstring>

#include "tool_args.h"
#include "tool_progress.h"
#include "vrx.h"

namespace {

enum OptionId { kFilter, kOmitUser, kQuiet };

constexpr vrx_tool::Option kOptions[] = {
    {kFilter, 'f', "filter", true},
    {kOmitUser, 'u', "omit-user", false},
    {kQuiet, 'q', "quiet", false},
};

constexpr vrx_tool::ToolInfo kInfo = {
    "hxb2vrx",
    VRX_VERSION,
    "[-f FILE | --filter FILE] [-u | --omit-user] [-q | --quiet] INPUT OUTPUT",
    "\n"
    "Writes the design (.hxb) or library (.hxl) file INPUT as the VRX text netlist OUTPUT.\n"
    "OUTPUT is replaced only by a complete file; a device, FIFO or terminal is written in\n"
    "place. \"-\" as INPUT reads standard input, as OUTPUT writes standard output. An OUTPUT\n"
    "that is the INPUT file is refused. With SOURCE_DATE_EPOCH set, the header's time is\n"
    "that, in UTC. On a terminal, standard error shows how far each step has come.\n"
    "\n"
    "Options:\n"
    "  -f, --filter FILE  pass every written property through the property filter FILE\n"
    "  -u, --omit-user    leave the USER flag out of block headers\n"
    "  -q, --quiet        print neither status lines nor progress; only warnings and errors\n"
    "      --help         print this help and exit\n"
    "      --version      print the version and exit\n"
    "\n"
    "Exit status:\n"
    "  0   success\n"
    "  1   a file could not be opened, read or written, or the filter file is bad\n"
    "  2   a fatal error: the input holds a value that the text format cannot carry\n"
    "  64  usage error\n",
    2,
    2,
};

struct Settings {
    const char* filter = nullptr;
    uint8_t omit_user = 0;
    bool quiet = false;
    const char* input = nullptr;
    const char* output = nullptr;
};

Settings settings_from(const vrx_tool::CommandLine& line) {
    Settings settings;
    for (const vrx_tool::GivenOption& option : line.options) {
        switch (option.id) {
            case kFilter:
                settings.filter = option.argument;  // the last one given counts
                break;
            case kOmitUser:
                settings.omit_user = 1;
                break;
            case kQuiet:
                settings.quiet = true;
                break;
        }
    }
    settings.input = line.operands[0];
    settings.output = line.operands[1];
    return settings;
}

int convert(const Settings& settings) {
    vrx_tool::ProgressLine* progress =
        vrx_tool::set_up_output(settings.quiet, std::strcmp(settings.output, "-") == 0);
    VRX vrx;
    if (progress != nullptr) vrx.set_progress(vrx_tool::ProgressLine::report, progress);
    const VX_STATUS read = vrx.hxb_read(settings.input);
    if (progress != nullptr) progress->clear();
    if (read != VX_OK) return read;
    const VX_STATUS written = vrx.vrx_write(settings.output, settings.filter, settings.omit_user);
    if (progress != nullptr) progress->clear();
    return written;
}

}  // namespace

int main(int argc, char** argv) {
    const vrx_tool::CommandLine line = vrx_tool::parse_command_line(argc, argv, kOptions, kInfo);
    if (line.exit_status) return *line.exit_status;
    Port::guard_temporary_files();
    return convert(settings_from(line));
}
