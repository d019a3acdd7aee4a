#include "port_msg.h"

#include <cstdio>
#include <cstdlib>
#include <string>
#include <utility>

namespace {

struct Dispatcher {
    Port_MsgSink sink;
    Port_ExitHandler exit_handler;
    int errors = 0;
    int warnings = 0;
};

Dispatcher& dispatcher() {
    static Dispatcher d;
    return d;
}

void write_all(std::FILE* to, std::string_view text) {
    std::fwrite(text.data(), 1, text.size(), to);
}

}  // namespace

Port_MsgSink Port_MsgDispatcher::set_sink(Port_MsgSink sink) {
    return std::exchange(dispatcher().sink, std::move(sink));
}

Port_ExitHandler Port_MsgDispatcher::set_exit_handler(Port_ExitHandler handler) {
    return std::exchange(dispatcher().exit_handler, std::move(handler));
}

void Port_MsgDispatcher::dispatch(Port_MsgLevel level, const Port_MsgLocation& where,
                                  std::string_view text) {
    Dispatcher& d = dispatcher();
    if (level == PORT_MSG_WARNING) ++d.warnings;
    if (level >= PORT_MSG_ERROR) ++d.errors;
    if (d.sink) {
        d.sink(level, where, text);
    } else {
        default_sink(level, where, text);
    }
}

void Port_MsgDispatcher::exit(int code) {
    Dispatcher& d = dispatcher();
    if (d.exit_handler) {
        d.exit_handler(code);
        return;
    }
    std::fflush(nullptr);
    std::exit(code);
}

int Port_MsgDispatcher::num_errors() {
    return dispatcher().errors;
}
int Port_MsgDispatcher::num_warnings() {
    return dispatcher().warnings;
}

void Port_MsgDispatcher::reset_counts() {
    dispatcher().errors = 0;
    dispatcher().warnings = 0;
}

const char* Port_MsgDispatcher::level_name(Port_MsgLevel level) {
    switch (level) {
        case PORT_MSG_STATUS:
            return "STATUS";
        case PORT_MSG_INFO:
            return "INFO";
        case PORT_MSG_WARNING:
            return "WARNING";
        case PORT_MSG_ERROR:
            return "ERROR";
        case PORT_MSG_INTERNAL:
            return "INTERNAL_ERROR";
        case PORT_MSG_FATAL:
            return "FATAL_ERROR";
    }
    return "UNKNOWN";
}

void Port_MsgDispatcher::default_sink(Port_MsgLevel level, const Port_MsgLocation& where,
                                      std::string_view text) {
    if (level == PORT_MSG_STATUS) {
        write_all(stdout, text);
        std::fflush(stdout);
        return;
    }
    std::string line = level_name(level);
    line += ':';
    line += where.module;
    line += " - ";
    line += text;
    if (line.back() != '\n') line += '\n';
    std::fflush(stdout);  // keep status lines and reports in their order on a terminal
    write_all(stderr, line);
}

Port_MsgManData Port_MsgManData::createObject(std::string_view module, std::string_view file,
                                              int line, std::string_view revision) {
    return Port_MsgManData(Port_MsgLocation{module, file, line, revision});
}

void Port_MsgManData::issue(Port_MsgLevel level, const char* format, std::va_list args) const {
    const std::string text = UT_STR::VFormat(format, args);
    Port_MsgDispatcher::dispatch(level, where_, text);
}

#define PORT_ISSUE_AT(method, level)                              \
    void Port_MsgManData::method(const char* format, ...) const { \
        std::va_list args;                                        \
        va_start(args, format);                                   \
        issue(level, format, args);                               \
        va_end(args);                                             \
    }

PORT_ISSUE_AT(issueStatus, PORT_MSG_STATUS)
PORT_ISSUE_AT(issueInfo, PORT_MSG_INFO)
PORT_ISSUE_AT(issueWarning, PORT_MSG_WARNING)
PORT_ISSUE_AT(issueError, PORT_MSG_ERROR)
PORT_ISSUE_AT(issueInternal, PORT_MSG_INTERNAL)

#undef PORT_ISSUE_AT

void Port_MsgManData::issueFatal(int code, const char* format, ...) const {
    std::va_list args;
    va_start(args, format);
    issue(PORT_MSG_FATAL, format, args);
    va_end(args);
    Port_MsgDispatcher::exit(code);
}

Port_MsgLocation Port_CArgFn(const char* module, const char* file, int line, const char* revision) {
    return Port_MsgLocation{module ? module : "", file ? file : "", line, revision ? revision : ""};
}

void Port_CLocErrorFn(const Port_MsgLocation& where, const char* text) {
    Port_MsgDispatcher::dispatch(PORT_MSG_ERROR, where, text ? text : "");
}

void Port_CLocWarningFn(const Port_MsgLocation& where, const char* text) {
    Port_MsgDispatcher::dispatch(PORT_MSG_WARNING, where, text ? text : "");
}
