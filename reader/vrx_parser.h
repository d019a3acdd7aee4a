// The text reader's interface: the property list a statement hands on, the
// kinds passed with it, the parse entry points and the callbacks the grammar
// makes.
//
// The reader builds nothing. Each complete statement becomes one call of a
// `vrx_*` callback below; the converter defines those callbacks and forwards
// them to the active converter object. A test build may link recording
// versions instead, which is how the reader is tested on its own.
//
// All reader state (scanner buffer, line counter, error count, `prop_array`)
// is process-wide and serves one parse at a time.
#pragma once

#include <cstdint>
#include <cstdio>

/// Longest name or value text, in bytes, that a statement can carry.
inline constexpr int VX_MAX_TEXT = 1024;
/// Most properties one statement can carry.
inline constexpr int VX_MAX_PROPS = 256;

/// One property as written: `name` or `name=value`. Both are NUL-terminated;
/// `value` is empty when no "=" and value were written.
struct VX_PROP {
    char name[VX_MAX_TEXT + 1];
    char value[VX_MAX_TEXT + 1];
};

/// The property list of one statement: entries 0 to count-1 in text order.
struct VX_PROP_ARRAY {
    VX_PROP entries[VX_MAX_PROPS];
    int32_t count;
};

/// The reader's one property list, overwritten by every statement. A callback
/// reads it during the call and keeps nothing of it.
extern VX_PROP_ARRAY prop_array;

/// Kind of a signal statement.
enum VX_SIGNAL_TYPE : int32_t {
    VX_PHYSSIGNAL = 0,
    VX_SIGNAL = 1,
};

/// Error state of the current parse.
enum VX_PARSER_STATUS : int32_t {
    VX_PARSER_OK = 0,
    VX_PARSER_ERROR = 1,
};

// --- Reader state and entry points (defined by the reader) -----------------

/// Line the scanner stands on after the last token it read (1-based).
extern int32_t line_number;
/// Parse errors reported for the current file.
extern int32_t error_count;

/// Resets `line_number` to 1 and `error_count` to 0; called before each file.
void vrx_parse_init();
/// Makes `stream` the scanner's input, discarding anything still buffered from
/// the former one. The caller keeps ownership of the stream.
void vrx_set_input(std::FILE* stream);
/// Parses the current input: 0 accepted, 1 stopped at a syntax error,
/// 2 the parser's stack limit was reached.
int32_t vrx_parse();

/// Line-numbered error report; marks the parse failed and counts toward the
/// limit of 20 errors per file, the last of which ends the run.
void vrx_parse_error(const char* text);
/// Line-numbered warning report; changes no state.
void vrx_parse_warning(const char* text);

// --- Callbacks (defined by the converter) -----------------------------------
// Texts are valid only during the call. `props` points at `prop_array`, or is
// null where the statement has no property list.

void vrx_do_library_props(VX_PROP_ARRAY* props);
void vrx_begin_design(const char* name, VX_PROP_ARRAY* props);
void vrx_end_design();
void vrx_add_alias(const char* name, const char* alias);
void vrx_begin_block(const char* name, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props);
void vrx_begin_prim(const char* type, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props);
void vrx_end_block();
void vrx_do_pin(const char* name, VX_PROP_ARRAY* props);
void vrx_do_signal(const char* name, VX_SIGNAL_TYPE kind, VX_PROP_ARRAY* props);
void vrx_do_mapsignal(const char* block, const char* pin, VX_PROP_ARRAY* props);
void vrx_add_mapconn(const char* block, const char* pin, VX_PROP_ARRAY* props);
void vrx_set_parser_status(VX_PARSER_STATUS status);
