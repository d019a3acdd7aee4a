// The message manager of the portability library.
//
// Every report has a level, a location (module, source file, line, revision
// text) and a formatted text. One process-wide dispatcher hands reports to a
// sink and counts the errors and warnings issued. Fatal reports end with a call
// of the exit handler.
//
// Defaults: status text goes to standard output exactly as written; the other
// levels go to standard error as "LEVEL:Module - text", with a line end added
// unless the text already ends in one. The default exit handler ends the
// process with the code; it is the only place of the library that does.
//
// A host replaces the sink to route messages elsewhere and the exit handler to
// keep the process alive. When an exit handler returns, control comes back to
// the code that issued the fatal report, which must then carry on safely.
//
// The dispatcher is not synchronised: reports are issued from one thread at a
// time, as the converter runs on its caller's thread.
#pragma once

#include <functional>
#include <string_view>

#include "ut_str.h"

enum Port_MsgLevel : int {
    PORT_MSG_STATUS,
    PORT_MSG_INFO,
    PORT_MSG_WARNING,
    PORT_MSG_ERROR,
    PORT_MSG_INTERNAL,
    PORT_MSG_FATAL,
};

/// Where a report comes from. The views refer to texts that outlive the report
/// (string literals in practice); a sink that keeps them must copy them.
struct Port_MsgLocation {
    std::string_view module;
    std::string_view file;
    int line = 0;
    std::string_view revision;
};

using Port_MsgSink =
    std::function<void(Port_MsgLevel level, const Port_MsgLocation& where, std::string_view text)>;
using Port_ExitHandler = std::function<void(int code)>;

class Port_MsgDispatcher {
  public:
    /// Installs a sink; an empty one restores the default. Returns the former.
    static Port_MsgSink set_sink(Port_MsgSink sink);
    /// Installs an exit handler; an empty one restores the default. Returns the former.
    static Port_ExitHandler set_exit_handler(Port_ExitHandler handler);

    /// Counts the report, then hands it to the sink.
    static void dispatch(Port_MsgLevel level, const Port_MsgLocation& where, std::string_view text);
    /// Calls the exit handler with the code.
    static void exit(int code);

    /// Errors counted: error, internal and fatal reports.
    static int num_errors();
    static int num_warnings();
    static void reset_counts();

    /// The default sink, for hosts that filter and then pass reports on.
    static void default_sink(Port_MsgLevel level, const Port_MsgLocation& where,
                             std::string_view text);
    /// "STATUS", "INFO", "WARNING", "ERROR", "INTERNAL_ERROR" or "FATAL_ERROR".
    static const char* level_name(Port_MsgLevel level);
};

/// A message object for reports from one location.
class Port_MsgManData {
  public:
    static Port_MsgManData createObject(std::string_view module, std::string_view file, int line,
                                        std::string_view revision);

    void issueStatus(const char* format, ...) const UT_PRINTF_FORMAT(2, 3);
    void issueInfo(const char* format, ...) const UT_PRINTF_FORMAT(2, 3);
    void issueWarning(const char* format, ...) const UT_PRINTF_FORMAT(2, 3);
    void issueError(const char* format, ...) const UT_PRINTF_FORMAT(2, 3);
    void issueInternal(const char* format, ...) const UT_PRINTF_FORMAT(2, 3);
    /// Issues the report at fatal level, then calls the exit handler with code.
    void issueFatal(int code, const char* format, ...) const UT_PRINTF_FORMAT(3, 4);

    const Port_MsgLocation& location() const { return where_; }

  private:
    explicit Port_MsgManData(const Port_MsgLocation& where) : where_(where) {}
    void issue(Port_MsgLevel level, const char* format, std::va_list args) const;

    Port_MsgLocation where_;
};

/// The stem of a source path: "dir/basvrx.cpp" gives "basvrx".
constexpr std::string_view Port_SourceStem(std::string_view path) {
    const auto slash = path.find_last_of('/');
    if (slash != std::string_view::npos) path.remove_prefix(slash + 1);
    const auto dot = path.find_last_of('.');
    if (dot != std::string_view::npos && dot > 0) path = path.substr(0, dot);
    return path;
}

/// Message object for the current source file and line.
#define PORT_MSG(module, revision) \
    Port_MsgManData::createObject((module), Port_SourceStem(__FILE__), __LINE__, (revision))

// Plain-function form, for code that carries no message object.
Port_MsgLocation Port_CArgFn(const char* module, const char* file, int line, const char* revision);
void Port_CLocErrorFn(const Port_MsgLocation& where, const char* text);
void Port_CLocWarningFn(const Port_MsgLocation& where, const char* text);
