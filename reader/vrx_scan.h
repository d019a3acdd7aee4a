// The reader's private interface between scanner, parser and diagnostics.
// Not part of the reader's public header: only the reader itself and its
// tests include it.
#pragma once

#include <cstddef>
#include <cstdint>

/// Token kinds the scanner returns. VX_TOK_END is the end of input.
enum VX_TOKEN : int32_t {
    VX_TOK_END = 0,
    VX_TOK_DESIGN,
    VX_TOK_BLOCK,
    VX_TOK_PHYSBLOCK,
    VX_TOK_PRIM,
    VX_TOK_PHYSPRIM,
    VX_TOK_PIN,
    VX_TOK_SIGNAL,
    VX_TOK_PHYSSIGNAL,
    VX_TOK_MAPSIGNAL,
    VX_TOK_MAPCONN,
    VX_TOK_EQUALS,
    VX_TOK_LPAREN,
    VX_TOK_RPAREN,
    VX_TOK_LBRACE,
    VX_TOK_RBRACE,
    VX_TOK_NUMBER,
    VX_TOK_STRING,
};

/// Value of the token just returned. `text` points into the scanner's buffer,
/// is NUL-terminated and stays valid until the next `vrx_next_token` or
/// `vrx_set_input`; the parser copies what it keeps. The VX_TEXT_BLOCK bytes
/// from `text` on may all be read (those behind the text are unspecified), so
/// a short text can be copied as one fixed-size block.
struct VX_TOKEN_VALUE {
    int32_t number;      // NUMBER: 0 to INT32_MAX
    const char* text;    // STRING: at most VX_MAX_TEXT bytes
    std::size_t length;  // STRING: bytes in `text`
};

extern VX_TOKEN_VALUE token_value;

inline constexpr std::size_t VX_TEXT_BLOCK = 32;

/// Reads the next token from the current input.
VX_TOKEN vrx_next_token();

/// Ends the run with exit code 2 through the host's exit handler. Should the
/// handler return, the run is marked ended: the parser then stops at once and
/// makes no further callbacks.
void vrx_end_run();
/// True once `vrx_end_run` came back, until the next `vrx_parse` starts.
inline bool vrx_run_ended() {
    extern bool vrx_run_end_flag;
    return vrx_run_end_flag;
}
/// Called by `vrx_parse` when it starts.
void vrx_clear_run_ended();

/// The scanner's allocator for its read-ahead buffer, with the semantics of
/// std::realloc; the scanner releases the buffer with std::free. Tests replace
/// it to reach the out-of-memory stops.
using VX_REALLOC_FN = void* (*)(void* block, std::size_t size);
extern VX_REALLOC_FN vrx_scan_realloc;
