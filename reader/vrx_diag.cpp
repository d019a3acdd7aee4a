// The reader's diagnostics: line-numbered error and warning reports, the
// per-file error limit and the reader's line and error counters.
//
// Scanner, parser and every builder method report parse-time messages through
// `vrx_parse_error` and `vrx_parse_warning`, so all of them carry the line the
// scanner stands on and all errors count toward the same limit.
#include <string>

#include "port_msg.h"
#include "ut_str.h"
#include "vrx_parser.h"
#include "vrx_scan.h"

int32_t line_number = 1;
int32_t error_count = 0;

namespace {

constexpr const char* kModule = "Quorra";
constexpr const char* kSourceFile = "../s/vrx";
constexpr const char* kRevision = "$Revision: 1.3 $";
constexpr int32_t kMaxErrors = 20;

// The whole text, however long: builder messages carry names of up to 1024
// bytes and more besides.
std::string numbered(const char* text) {
    return UT_STR::Format("Line number %d: %s\n", line_number, text ? text : "");
}

}  // namespace

void vrx_parse_init() {
    line_number = 1;
    error_count = 0;
}

void vrx_parse_error(const char* text) {
    const Port_MsgLocation where = Port_CArgFn(kModule, kSourceFile, __LINE__, kRevision);
    Port_CLocErrorFn(where, numbered(text).c_str());
    vrx_set_parser_status(VX_PARSER_ERROR);
    if (++error_count == kMaxErrors) {
        Port_CLocErrorFn(where, "maximum error limit reached...aborting\n");
        vrx_end_run();
    }
}

void vrx_parse_warning(const char* text) {
    const Port_MsgLocation where = Port_CArgFn(kModule, kSourceFile, __LINE__, kRevision);
    Port_CLocWarningFn(where, numbered(text).c_str());
}

bool vrx_run_end_flag = false;

void vrx_end_run() {
    Port_MsgDispatcher::exit(2);
    vrx_run_end_flag = true;
}

void vrx_clear_run_ended() {
    vrx_run_end_flag = false;
}
