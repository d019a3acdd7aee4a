// The reader's private interface between scanner, parser and diagnostics.
// Not part of the reader's public header: only the reader itself and its
// tests include it, and the converter for the progress hook below.
//
// The scanner's common tokens (words, keywords, short numbers, separators, with
// the blanks and line ends before them) are scanned by the inline
// `vrx_next_token` below, so that the parser reads them without a call and
// each of its call sites predicts the next token's class on its own. Every
// other case goes to `vrx_scan_token` in vrx_scan.cpp, which describes the
// scanner as a whole.
#pragma once

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "vrx_parser.h"

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

/// Value of the token just returned. `text` points into the scanner's buffer
/// and stays valid until the next `vrx_next_token` or `vrx_set_input`; it is
/// not NUL-terminated: `length` bytes are the text. The parser copies what it
/// keeps. The VX_TEXT_BLOCK bytes from `text` on may all be read (those behind
/// the text are unspecified), so a short text can be copied as one fixed-size
/// block.
struct VX_TOKEN_VALUE {
    int32_t number;      // NUMBER: 0 to INT32_MAX
    const char* text;    // STRING: at most VX_MAX_TEXT bytes
    std::size_t length;  // STRING: bytes in `text`
};

extern VX_TOKEN_VALUE token_value;

inline constexpr std::size_t VX_TEXT_BLOCK = 32;

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

/// Progress of the scan: `bytes_read` bytes read from the current input so
/// far. Called after every block read from the input (a few kilobytes), never
/// per token; the count starts again at each `vrx_set_input`.
using VX_SCAN_PROGRESS_FN = void (*)(void* context, uint64_t bytes_read);
/// Installs the hook; a null `fn` removes it.
void vrx_set_scan_progress(VX_SCAN_PROGRESS_FN fn, void* context);

/// The scanner's allocator for its read-ahead buffer, with the semantics of
/// std::realloc; the scanner releases the buffer with std::free. Tests replace
/// it to reach the out-of-memory stops.
using VX_REALLOC_FN = void* (*)(void* block, std::size_t size);
extern VX_REALLOC_FN vrx_scan_realloc;

// --- Byte classes ----------------------------------------------------------------

enum VX_BYTE_CLASS : unsigned char {
    VX_BC_NUL,        // the sentinel behind the data, or a NUL in the input
    VX_BC_BLANK,      // space, tab
    VX_BC_LINE_END,   // line feed
    VX_BC_CR,         // carriage return: a line end before a line feed, else a word byte
    VX_BC_QUOTE,      // "
    VX_BC_SEPARATOR,  // ( ) { } =
    VX_BC_DIGIT,      // 0-9
    VX_BC_WORD,       // every other byte; words are runs of VX_BC_DIGIT and VX_BC_WORD
};

constexpr std::array<unsigned char, 256> vrx_make_byte_classes() {
    std::array<unsigned char, 256> classes{};
    for (unsigned char& c : classes)
        c = VX_BC_WORD;
    classes[0] = VX_BC_NUL;
    classes[' '] = classes['\t'] = VX_BC_BLANK;
    classes['\n'] = VX_BC_LINE_END;
    classes['\r'] = VX_BC_CR;
    classes['"'] = VX_BC_QUOTE;
    for (unsigned char c : {'(', ')', '{', '}', '='})
        classes[c] = VX_BC_SEPARATOR;
    for (unsigned char c = '0'; c <= '9'; ++c)
        classes[c] = VX_BC_DIGIT;
    return classes;
}

inline constexpr std::array<unsigned char, 256> vrx_byte_classes = vrx_make_byte_classes();

inline unsigned char vrx_byte_class(const char* p) {
    return vrx_byte_classes[static_cast<unsigned char>(*p)];
}

inline bool vrx_in_word(const char* p) {
    return vrx_byte_class(p) >= VX_BC_DIGIT;
}

// --- Scanner position -----------------------------------------------------------

/// The next byte to scan. Between tokens it always points at readable bytes
/// ending in a NUL: into the read-ahead buffer, or at a NUL of its own when
/// there is no buffer or the scan has stopped (which sends the next call to
/// `vrx_scan_token`). At least VX_TEXT_BLOCK readable bytes follow every NUL
/// that ends the data.
extern char* vrx_scan_cur;

/// Scans the token that starts at or behind `p`: every case, including the
/// end of the buffered data. Returns it and moves `vrx_scan_cur` behind it.
VX_TOKEN vrx_scan_token(char* p);

/// The first byte from `p` on that is no word byte. A plain byte loop: words
/// are short, and here it beat eight-byte (SWAR) tests, whose longer chain of
/// dependent operations delays the next token.
inline char* vrx_word_end(char* p) {
    while (vrx_in_word(p))
        ++p;
    return p;
}

// --- Keywords ---------------------------------------------------------------------
// One table slot per keyword, picked by its first byte and length; a word is
// that keyword when the slot's length and its first 16 bytes, masked to the
// length, agree. No branch on the length, which varies from word to word.

struct VX_KEYWORD {
    uint64_t text[2];  // the spelling, as loaded from memory
    uint64_t mask[2];  // all ones over the spelling's bytes
    std::size_t length;
    VX_TOKEN token;
};

constexpr std::size_t vrx_keyword_slot(unsigned char first, std::size_t length) {
    return (first + 11 * length) & 15;
}

template <std::size_t N>
constexpr VX_KEYWORD vrx_keyword(const char (&spelling)[N], VX_TOKEN token) {
    std::array<char, 16> text{};
    std::array<unsigned char, 16> mask{};
    for (std::size_t i = 0; i < N - 1; ++i) {
        text[i] = spelling[i];
        mask[i] = 0xFF;
    }
    const auto halves = std::bit_cast<std::array<uint64_t, 2>>(text);
    const auto masks = std::bit_cast<std::array<uint64_t, 2>>(mask);
    return {{halves[0], halves[1]}, {masks[0], masks[1]}, N - 1, token};
}

constexpr std::array<VX_KEYWORD, 16> vrx_make_keywords() {
    const VX_KEYWORD all[] = {
        vrx_keyword("DESIGN", VX_TOK_DESIGN),       vrx_keyword("BLOCK", VX_TOK_BLOCK),
        vrx_keyword("PHYSBLOCK", VX_TOK_PHYSBLOCK), vrx_keyword("PRIM", VX_TOK_PRIM),
        vrx_keyword("PHYSPRIM", VX_TOK_PHYSPRIM),   vrx_keyword("PIN", VX_TOK_PIN),
        vrx_keyword("SIGNAL", VX_TOK_SIGNAL),       vrx_keyword("PHYSSIGNAL", VX_TOK_PHYSSIGNAL),
        vrx_keyword("MAPSIGNAL", VX_TOK_MAPSIGNAL), vrx_keyword("MAPCONN", VX_TOK_MAPCONN),
    };
    std::array<VX_KEYWORD, 16> slots{};  // length 0: matches no word
    for (const VX_KEYWORD& k : all) {
        const auto first =
            static_cast<unsigned char>(std::bit_cast<std::array<char, 8>>(k.text[0])[0]);
        VX_KEYWORD& slot = slots[vrx_keyword_slot(first, k.length)];
        if (slot.length != 0) throw "two keywords share a slot";
        slot = k;
    }
    return slots;
}

inline constexpr std::array<VX_KEYWORD, 16> vrx_keywords = vrx_make_keywords();

/// The keyword spelled by the `length` bytes at `p`, or VX_TOK_STRING. The 16
/// bytes from `p` on must be readable.
inline uint64_t vrx_load8(const char* p) {
    uint64_t w;
    std::memcpy(&w, p, sizeof w);
    return w;
}

inline VX_TOKEN vrx_keyword_token(const char* p, std::size_t length) {
    static_assert(VX_TEXT_BLOCK >= 16, "the slack behind the buffer covers both loads");
    const VX_KEYWORD& k = vrx_keywords[vrx_keyword_slot(static_cast<unsigned char>(*p), length)];
    const uint64_t differ =
        ((vrx_load8(p) ^ k.text[0]) & k.mask[0]) | ((vrx_load8(p + 8) ^ k.text[1]) & k.mask[1]);
    return k.length == length && differ == 0 ? k.token : VX_TOK_STRING;
}

// --- The common tokens -------------------------------------------------------------

inline VX_TOKEN vrx_separator_token(char c) {
    switch (c) {
        case '(':
            return VX_TOK_LPAREN;
        case ')':
            return VX_TOK_RPAREN;
        case '{':
            return VX_TOK_LBRACE;
        case '}':
            return VX_TOK_RBRACE;
        default:
            return VX_TOK_EQUALS;
    }
}

/// A word from `tok` on, when it is not too long and ends inside the buffered
/// data, and not at a lone CR (which is a word byte); anything else is left to
/// `vrx_scan_token`.
[[gnu::always_inline]] inline VX_TOKEN vrx_word_token(char* tok) {
    char* end = vrx_word_end(tok + 1);
    const auto length = static_cast<std::size_t>(end - tok);
    const unsigned char stop = vrx_byte_class(end);
    const bool lone_cr = stop == VX_BC_CR && end[1] != '\n';
    if (stop == VX_BC_NUL || lone_cr || length > VX_MAX_TEXT) return vrx_scan_token(tok);
    vrx_scan_cur = end;
    const VX_TOKEN kw = vrx_keyword_token(tok, length);
    if (kw != VX_TOK_STRING) return kw;
    token_value.text = tok;
    token_value.length = length;
    return VX_TOK_STRING;
}

/// A number from `tok` on, when it has at most nine digits (so it is in range)
/// and ends at a blank, line end, quote or separator; anything else is left
/// to `vrx_scan_token`.
inline VX_TOKEN vrx_number_token(char* tok) {
    int32_t value = 0;
    char* p = tok;
    do {
        value = value * 10 + (*p - '0');
        ++p;
    } while (vrx_byte_class(p) == VX_BC_DIGIT && p - tok < 9);
    const unsigned char stop = vrx_byte_class(p);
    const bool lone_cr = stop == VX_BC_CR && p[1] != '\n';
    if (stop >= VX_BC_DIGIT || stop == VX_BC_NUL || lone_cr) return vrx_scan_token(tok);
    vrx_scan_cur = p;
    token_value.number = value;
    return VX_TOK_NUMBER;
}

/// The one place that moves `line_number`. It stops at INT32_MAX rather than
/// overflow on an input of more than two thousand million lines.
inline void vrx_add_lines(int64_t lines) {
    const int64_t line = line_number + lines;
    line_number = line < INT32_MAX ? static_cast<int32_t>(line) : INT32_MAX;
}

/// Reads the next token from the current input.
[[gnu::always_inline]] inline VX_TOKEN vrx_next_token() {
    char* p = vrx_scan_cur;
    for (;;) {
        switch (vrx_byte_class(p)) {
            case VX_BC_CR:
                if (p[1] != '\n') return vrx_scan_token(p);  // a word, or the data ends
                ++p;
                [[fallthrough]];
            case VX_BC_LINE_END:
                vrx_add_lines(1);
                [[fallthrough]];
            case VX_BC_BLANK:  // the whole run: one dispatch per blank costs more
                do
                    ++p;
                while (vrx_byte_class(p) == VX_BC_BLANK);
                break;
            case VX_BC_SEPARATOR:
                vrx_scan_cur = p + 1;
                return vrx_separator_token(*p);
            case VX_BC_DIGIT:
                return vrx_number_token(p);
            case VX_BC_WORD:
                if (*p == '/') return vrx_scan_token(p);  // maybe a comment
                return vrx_word_token(p);
            default:
                return vrx_scan_token(p);
        }
    }
}
