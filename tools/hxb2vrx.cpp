// hxb2vrx: writes a design (.hxb) or library (.hxl) file as a VRX text netlist.
//
//   hxb2vrx [-f FILE | --filter FILE] [-u | --omit-user] INPUT OUTPUT
//
// Progress and faults are reported through the message manager's default
// sink: status lines on standard output, everything else on standard error.
// The exit status is the VX_STATUS of the first step that failed, 0 when
// both succeeded, 2 after a fatal report (which ends the run), or 64 for a
// usage error.
#include <cstdint>

#include "tool_args.h"
#include "vrx.h"

namespace {

enum OptionId { kFilter, kOmitUser };

constexpr vrx_tool::Option kOptions[] = {
    {kFilter, 'f', "filter", true},
    {kOmitUser, 'u', "omit-user", false},
};

constexpr vrx_tool::ToolInfo kInfo = {
    "hxb2vrx",
    VRX_VERSION,
    "[-f FILE | --filter FILE] [-u | --omit-user] INPUT OUTPUT",
    "\n"
    "Writes the design (.hxb) or library (.hxl) file INPUT as the VRX text netlist OUTPUT.\n"
    "OUTPUT is replaced only by a complete file.\n"
    "\n"
    "Options:\n"
    "  -f, --filter FILE  pass every written property through the property filter FILE\n"
    "  -u, --omit-user    leave the USER flag out of block headers\n"
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
        }
    }
    settings.input = line.operands[0];
    settings.output = line.operands[1];
    return settings;
}

int convert(const Settings& settings) {
    VRX vrx;
    VX_STATUS status = vrx.hxb_read(settings.input);
    if (status != VX_OK) return status;
    return vrx.vrx_write(settings.output, settings.filter, settings.omit_user);
}

}  // namespace

int main(int argc, char** argv) {
    const vrx_tool::CommandLine line = vrx_tool::parse_command_line(argc, argv, kOptions, kInfo);
    if (line.exit_status) return *line.exit_status;
    return convert(settings_from(line));
}
