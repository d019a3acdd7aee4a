#include "tool_args.h"

#include <cstring>
#include <string>
#include <string_view>

namespace vrx_tool {

namespace {

void print_usage_line(const ToolInfo& info, std::FILE* stream) {
    std::fprintf(stream, "usage: %s %s\n", info.name, info.synopsis);
}

/// Writes the help or version text; a failed write (a full disk, a closed
/// pipe) must not pass for success.
int finish_output(const ToolInfo& info, std::FILE* out, std::FILE* err) {
    if (std::fflush(out) != 0 || std::ferror(out)) {
        std::fprintf(err, "%s: cannot write to standard output\n", info.name);
        return kExitOutputError;
    }
    return kExitOk;
}

int print_help(const ToolInfo& info, std::FILE* out, std::FILE* err) {
    print_usage_line(info, out);
    std::fprintf(out, "%s", info.details);
    return finish_output(info, out, err);
}

int print_version(const ToolInfo& info, std::FILE* out, std::FILE* err) {
    std::fprintf(out, "%s %s\n", info.name, info.version);
    return finish_output(info, out, err);
}

const Option* find_short(std::span<const Option> options, char name) {
    for (const Option& option : options) {
        if (option.short_name != '\0' && option.short_name == name) return &option;
    }
    return nullptr;
}

const Option* find_long(std::span<const Option> options, std::string_view name) {
    for (const Option& option : options) {
        if (option.long_name != nullptr && name == option.long_name) return &option;
    }
    return nullptr;
}

/// Walks argv once; each handler returns false after a usage error or when
/// --help or --version ended the run.
class Parser {
  public:
    Parser(int argc, char* const* argv, std::span<const Option> options, const ToolInfo& info,
           std::FILE* out, std::FILE* err)
        : argc_(argc), argv_(argv), options_(options), info_(info), out_(out), err_(err) {}

    CommandLine run() {
        bool options_ended = false;
        for (index_ = 1; index_ < argc_; ++index_) {
            const char* word = argv_[index_];
            if (options_ended || word[0] != '-' || word[1] == '\0') {
                result_.operands.push_back(word);
            } else if (std::strcmp(word, "--") == 0) {
                options_ended = true;
            } else if (word[1] == '-') {
                if (!long_option(word + 2)) return std::move(result_);
            } else if (!short_options(word + 1)) {
                return std::move(result_);
            }
        }
        const std::size_t count = result_.operands.size();
        if (count < info_.min_operands) {
            fail(count == 0 ? "missing operands" : "too few operands");
        } else if (count > info_.max_operands) {
            fail("too many operands");
        }
        return std::move(result_);
    }

  private:
    bool long_option(const char* text) {
        const char* equals = std::strchr(text, '=');
        const std::string_view name =
            equals ? std::string_view(text, std::size_t(equals - text)) : std::string_view(text);
        if (name == "help" && equals == nullptr) return end(print_help(info_, out_, err_));
        if (name == "version" && equals == nullptr) return end(print_version(info_, out_, err_));

        const Option* option = find_long(options_, name);
        if (option == nullptr) {
            // --help=x and --version=x land here too: neither takes an argument.
            return fail("unknown option '--" + std::string(name) + "'");
        }
        if (!option->takes_argument) {
            if (equals != nullptr) {
                return fail("option '--" + std::string(name) + "' takes no argument");
            }
            result_.options.push_back({option->id, nullptr});
            return true;
        }
        const char* argument = equals ? equals + 1 : next_word();
        if (argument == nullptr) {
            return fail("option '--" + std::string(name) + "' needs an argument");
        }
        result_.options.push_back({option->id, argument});
        return true;
    }

    bool short_options(const char* letters) {
        for (const char* letter = letters; *letter != '\0'; ++letter) {
            const Option* option = find_short(options_, *letter);
            if (option == nullptr) return fail(std::string("unknown option '-") + *letter + "'");
            if (!option->takes_argument) {
                result_.options.push_back({option->id, nullptr});
                continue;
            }
            const char* argument = letter[1] != '\0' ? letter + 1 : next_word();
            if (argument == nullptr) {
                return fail(std::string("option '-") + *letter + "' needs an argument");
            }
            result_.options.push_back({option->id, argument});
            return true;
        }
        return true;
    }

    /// The word after the current one, consumed; null at the end.
    const char* next_word() { return index_ + 1 < argc_ ? argv_[++index_] : nullptr; }

    bool fail(const std::string& fault) { return end(usage_error(info_, fault.c_str(), err_)); }

    bool end(int status) {
        result_.exit_status = status;
        return false;
    }

    int argc_;
    char* const* argv_;
    std::span<const Option> options_;
    const ToolInfo& info_;
    std::FILE* out_;
    std::FILE* err_;
    int index_ = 1;
    CommandLine result_;
};

}  // namespace

CommandLine parse_command_line(int argc, char* const* argv, std::span<const Option> options,
                               const ToolInfo& info, std::FILE* out, std::FILE* err) {
    return Parser(argc, argv, options, info, out, err).run();
}

int usage_error(const ToolInfo& info, const char* fault, std::FILE* err) {
    std::fprintf(err, "%s: %s\n", info.name, fault);
    print_usage_line(info, err);
    std::fprintf(err, "Try '%s --help' for more information.\n", info.name);
    return kExitUsage;
}

}  // namespace vrx_tool
