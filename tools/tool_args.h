// Command-line handling shared by the tools.
//
// Options may come before, between or after the operands; "--" ends them,
// and a lone "-" is an operand. A short option that takes an argument takes
// the rest of its word ("-fFILE") or the next word ("-f FILE"); short flags
// may be grouped ("-ab"). A long option takes its argument after "="
// ("--filter=FILE") or as the next word ("--filter FILE"). Long names must be
// given in full.
//
// Every tool answers --help (usage, options and exit statuses on standard
// output) and --version ("<tool> <version>" on standard output), both ending
// the run with status 0. A usage error (unknown option, missing or unexpected
// option argument, wrong number of operands) prints the fault and the usage
// line on standard error and ends the run with status 64.
#pragma once

#include <cstddef>
#include <cstdio>
#include <optional>
#include <span>
#include <vector>

namespace vrx_tool {

inline constexpr int kExitOk = 0;
inline constexpr int kExitUsage = 64;
/// Status when the help or version text could not be written.
inline constexpr int kExitOutputError = 1;

/// One option a tool accepts; `id` is the tool's own name for it.
struct Option {
    int id;
    char short_name;        ///< '\0' when there is only a long name
    const char* long_name;  ///< without the leading "--"; null when there is only a short name
    bool takes_argument;
};

/// What a tool tells about itself for its usage line, --help and --version.
struct ToolInfo {
    const char* name;
    const char* version;
    const char* synopsis;  ///< what follows the tool's name on the usage line
    const char* details;   ///< the rest of --help: description, options, exit statuses
    std::size_t min_operands;
    std::size_t max_operands;
};

/// An option as given, in command-line order.
struct GivenOption {
    int id;
    const char* argument;  ///< null for an option without argument
};

struct CommandLine {
    std::vector<GivenOption> options;
    std::vector<const char*> operands;
    /// Set when the run ends here (after --help, --version or a usage error)
    /// with this exit status; everything was printed already.
    std::optional<int> exit_status;
};

/// Parses argv[1..argc-1]. Help and version text goes to `out`, usage errors to `err`.
CommandLine parse_command_line(int argc, char* const* argv, std::span<const Option> options,
                               const ToolInfo& info, std::FILE* out = stdout,
                               std::FILE* err = stderr);

/// Prints "<tool>: <fault>", the usage line and a pointer to --help on `err`;
/// returns kExitUsage. For faults that a tool finds after parsing.
int usage_error(const ToolInfo& info, const char* fault, std::FILE* err = stderr);

}  // namespace vrx_tool
