// The scanner: cuts the input into tokens for the parser.
//
// A hand-written lexer: one switch on the class of the current byte, a NUL
// sentinel behind the buffered bytes so that the inner loops need no bounds
// check, and token texts handed out in place, with their length. Nothing is
// allocated per token; the buffer grows only while one token is longer than it.
//
// The common tokens are scanned by the inline `vrx_next_token` in vrx_scan.h,
// inside the parser; it hands everything else to `vrx_scan_token` here: the
// end of the buffered data (refills), comments, long numbers, quoted strings, lone
// CRs, NUL bytes, over-long words and the fatal stops.
//
// Tokens follow the longest match over these rules, the earlier rule winning a
// tie: comment ("//" to the line end), blanks, separators, line feed, the ten
// keywords, number, word, quoted string, any other byte. Hence keywords are
// case-sensitive whole words, "//" starts a comment only where a token starts
// (x//y is one word), and a digit run followed by a word byte is a word (12ab).
// A quote with no closing quote matches none of them: it is reported as a
// warning on its line and scanning resumes right behind it.
//
// Input is read in blocks of up to 8192 bytes into a buffer of 16384 bytes;
// after each block a progress hook, when installed, hears the bytes read.
// A carriage return right before a line feed is dropped, so CRLF files scan
// exactly like LF files: it ends a word or number and is skipped with the line
// feed, and a quoted string's text loses it. Any other CR is a word byte.
//
// Choices where the format leaves the behaviour open:
// - A digit run above INT32_MAX is a word (STRING) holding its digits.
// - A NUL byte is reported as the parse error "invalid NUL byte in input" and
//   skipped; it ends a word. A quoted string cannot hold a NUL, so a quote
//   whose closing quote lies behind a NUL counts as unclosed. Inside a comment
//   a NUL is comment text, like every other byte up to the line feed.
// - A terminal is read in blocks like any other stream. A null stream set
//   with vrx_set_input stands for standard input, as when none was ever set.
// - The line feeds of a quoted string are counted before its length is
//   checked: "maximum string length exceeded" shows the line of the closing
//   quote.
// - An over-long word is not kept in the buffer while it is matched (its text
//   is dropped anyway), so only an unclosed quote or an over-long quoted string
//   makes the buffer grow.
// - The buffer is released at the end of input and when a new stream is set,
//   and made afresh for the next read, so no memory is held between files.
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "vrx_parser.h"
#include "vrx_scan.h"

namespace {

void* realloc_block(void* block, std::size_t size) {
    return std::realloc(block, size);
}

}  // namespace

VX_TOKEN_VALUE token_value = {0, "", 0};
VX_REALLOC_FN vrx_scan_realloc = realloc_block;

namespace {

constexpr std::size_t kInitialSize = 16384;
// Bytes allocated behind the buffer so that a token's text can be read in
// whole blocks of VX_TEXT_BLOCK bytes, and a word's first 16 bytes compared
// with a keyword in two loads (see vrx_scan.h).
constexpr std::size_t kSlack = VX_TEXT_BLOCK;
constexpr std::size_t kReadSize = 8192;

// Where `vrx_scan_cur` and `lim` point while there is no buffer, and where
// `vrx_scan_cur` points once the scan has stopped.
char no_data[kSlack] = {};

}  // namespace

char* vrx_scan_cur = no_data;

namespace {

struct Scanner {
    std::FILE* input = nullptr;  // null: standard input
    char* buf = nullptr;         // read-ahead buffer of `size` bytes, null when released
    std::size_t size = 0;
    char* lim = no_data;      // end of the buffered data; *lim is the NUL sentinel
    bool stopped = false;     // a fatal stop happened: end of input until a new stream
    uint64_t bytes_read = 0;  // from the current input
};

Scanner sc;

struct ProgressHook {
    VX_SCAN_PROGRESS_FN fn = nullptr;
    void* context = nullptr;
};

ProgressHook progress;

std::FILE* stream() {
    return sc.input ? sc.input : stdin;
}

// --- Buffer ------------------------------------------------------------------

void discard_buffer() {
    std::free(sc.buf);
    sc = Scanner{sc.input, nullptr, 0, no_data, sc.stopped, sc.bytes_read};
    vrx_scan_cur = no_data;
}

// The three stops the run cannot recover from. They bypass the message
// manager and end the run through the host's exit handler; if that returns,
// the scanner reports end of input until a new stream is set.
void fatal_stop(const char* text) {
    std::fputs(text, stderr);
    std::fputc('\n', stderr);
    std::fflush(stderr);
    sc.stopped = true;
    vrx_end_run();
}

bool create_buffer() {
    char* block = static_cast<char*>(vrx_scan_realloc(nullptr, kInitialSize + kSlack));
    if (!block) {
        fatal_stop("out of dynamic memory in yy_create_buffer()");
        return false;
    }
    sc.buf = vrx_scan_cur = sc.lim = block;
    sc.size = kInitialSize;
    *sc.lim = '\0';
    return true;
}

bool grow_buffer() {
    char* block = static_cast<char*>(vrx_scan_realloc(sc.buf, sc.size * 2 + kSlack));
    if (!block) {
        fatal_stop("fatal error - scanner input buffer overflow");
        return false;
    }
    sc.lim = block + (sc.lim - sc.buf);
    sc.buf = block;
    sc.size *= 2;
    return true;
}

// Reads the next block behind the buffered data. Returns the bytes added: 0
// at the end of input or after a fatal stop.
std::size_t read_block() {
    std::size_t room = sc.size - static_cast<std::size_t>(sc.lim - sc.buf) - 1;
    while (room == 0) {
        if (!grow_buffer()) return 0;
        room = sc.size - static_cast<std::size_t>(sc.lim - sc.buf) - 1;
    }
    const std::size_t want = room < kReadSize ? room : kReadSize;
    const std::size_t got = std::fread(sc.lim, 1, want, stream());
    if (got < want && std::ferror(stream())) {
        fatal_stop("input in flex scanner failed");
        return 0;
    }
    sc.lim += got;
    *sc.lim = '\0';
    sc.bytes_read += got;
    if (progress.fn != nullptr && got > 0) progress.fn(progress.context, sc.bytes_read);
    return got;
}

// Moves the bytes from `keep` on (the part of a token matched so far) to the
// front of the buffer and reads the next block behind them. `keep` follows the
// move; other pointers into the buffer must be re-derived from it. Returns the
// bytes added: 0 at the end of input or after a fatal stop.
std::size_t refill(char*& keep) {
    if (sc.stopped) return 0;
    const std::size_t kept = static_cast<std::size_t>(sc.lim - keep);
    if (keep != sc.buf) std::memmove(sc.buf, keep, kept);
    sc.lim = sc.buf + kept;
    const std::size_t added = read_block();
    keep = sc.buf;
    return added;
}

// --- Tokens ------------------------------------------------------------------

// At a CR at `p`: true when a line feed follows, which makes the CR part of
// the line end: it is skipped and never part of a token. Refills, keeping the
// bytes from `keep` on, when the CR is the last byte buffered; `p` follows.
bool crlf_at(char*& keep, char*& p) {
    if (p + 1 == sc.lim) {
        const auto offset = p - keep;
        refill(keep);
        p = keep + offset;
    }
    return p[1] == '\n';
}

VX_TOKEN string_token(char* text, std::size_t length) {
    token_value.text = text;
    token_value.length = length;
    return VX_TOK_STRING;
}

VX_TOKEN too_long() {
    static const char kEmpty[VX_TEXT_BLOCK] = {};
    vrx_parse_error("maximum string length exceeded");
    token_value.text = kEmpty;
    token_value.length = 0;
    return VX_TOK_STRING;
}

// A complete word [tok, end), of which `dropped` leading bytes are no longer
// in the buffer.
VX_TOKEN word_token(char* tok, char* end, std::size_t dropped) {
    if (sc.stopped) return VX_TOK_END;
    const std::size_t length = dropped + static_cast<std::size_t>(end - tok);
    if (length > VX_MAX_TEXT) return too_long();
    const VX_TOKEN kw = vrx_keyword_token(tok, length);
    if (kw != VX_TOK_STRING) return kw;
    return string_token(tok, length);
}

// Matches the rest of a word from `p` on; [tok, p) is matched already.
VX_TOKEN scan_word(char* tok, char* p) {
    std::size_t dropped = 0;
    for (;;) {
        p = vrx_word_end(p);
        if (*p == '\r') {
            if (crlf_at(tok, p)) break;
            ++p;  // a lone CR is a word byte
            continue;
        }
        if (p != sc.lim) break;
        std::size_t matched = static_cast<std::size_t>(p - tok);
        if (matched > VX_MAX_TEXT) {  // its text is lost anyway: keep none of it
            dropped += matched;
            tok = p;
            matched = 0;
        }
        const bool more = refill(tok) > 0;
        p = tok + matched;
        if (!more) break;
    }
    vrx_scan_cur = p;
    return word_token(tok, p, dropped);
}

// [p, end) holds digits only. False when the value is above INT32_MAX.
bool decimal_value(const char* p, const char* end, int32_t& value) {
    int64_t v = 0;
    for (; p < end; ++p) {
        v = v * 10 + (*p - '0');
        if (v > INT32_MAX) return false;
    }
    value = static_cast<int32_t>(v);
    return true;
}

VX_TOKEN scan_number(char* tok) {
    char* p = tok;
    for (;;) {
        while (vrx_byte_class(p) == VX_BC_DIGIT)
            ++p;
        if (p != sc.lim) break;
        const std::size_t matched = static_cast<std::size_t>(p - tok);
        if (matched > VX_MAX_TEXT) return scan_word(tok, p);  // a STRING whatever follows
        const bool more = refill(tok) > 0;
        p = tok + matched;
        if (!more) break;
    }
    if (vrx_byte_class(p) == VX_BC_WORD || (*p == '\r' && !crlf_at(tok, p))) {
        return scan_word(tok, p);
    }
    vrx_scan_cur = p;
    if (!decimal_value(tok, p, token_value.number)) return word_token(tok, p, 0);
    return VX_TOK_NUMBER;
}

// Drops each CR that a LF follows from [text, end); returns the new length.
std::size_t drop_crs(char* text, const char* end) {
    char* out = static_cast<char*>(std::memchr(text, '\r', static_cast<std::size_t>(end - text)));
    if (!out) return static_cast<std::size_t>(end - text);
    for (const char* in = out; in < end; ++in) {
        if (*in != '\r' || in[1] != '\n') *out++ = *in;
    }
    return static_cast<std::size_t>(out - text);
}

int64_t count_line_ends(const char* p, const char* end) {
    int64_t lines = 0;
    for (; p < end; ++p)
        lines += *p == '\n';
    return lines;
}

// A quote at `tok`. True with a STRING token when the quote is closed. False
// when it is not: the quote is reported and skipped, and scanning resumes
// right behind it. Its line feeds are not counted yet, so the report shows
// the quote's own line.
bool scan_quoted(char* tok) {
    char* p = tok + 1;
    for (;;) {
        while (*p != '"' && *p != '\0')
            ++p;
        if (*p == '"') break;
        const std::size_t matched = static_cast<std::size_t>(p - tok);
        if (p != sc.lim || refill(tok) == 0) {
            if (sc.stopped) return false;
            vrx_scan_cur = tok + 1;
            vrx_parse_warning("unclosed quote skipped");
            return false;
        }
        p = tok + matched;
    }
    char* text = tok + 1;
    const std::size_t length = drop_crs(text, p);
    vrx_add_lines(count_line_ends(text, text + length));
    vrx_scan_cur = p + 1;
    if (length + 2 > VX_MAX_TEXT) {
        too_long();
    } else {
        string_token(text, length);
    }
    return true;
}

// At a "/": true when a second "/" follows. `p` follows a refill.
bool starts_comment(char*& p) {
    if (p + 1 == sc.lim) refill(p);
    return p[1] == '/';
}

// Skips to the line feed that ends the comment (not part of it) or to the end of input.
void skip_comment(char* p) {
    for (;;) {
        const auto rest = static_cast<std::size_t>(sc.lim - p);
        if (char* lf = static_cast<char*>(std::memchr(p, '\n', rest))) {
            vrx_scan_cur = lf;
            return;
        }
        p = sc.lim;
        if (refill(p) == 0) {
            vrx_scan_cur = p;
            return;
        }
    }
}

// Blanks and line ends between tokens.
char* skip_space(char* p) {
    for (;;) {
        while (vrx_byte_class(p) == VX_BC_BLANK)
            ++p;
        if (*p == '\n') {
            ++p;
        } else if (*p == '\r' && crlf_at(p, p)) {
            p += 2;
        } else {
            return p;
        }
        vrx_add_lines(1);
    }
}

}  // namespace

void vrx_set_input(std::FILE* stream) {
    discard_buffer();
    sc.input = stream;
    sc.stopped = false;
    sc.bytes_read = 0;
}

void vrx_set_scan_progress(VX_SCAN_PROGRESS_FN fn, void* context) {
    progress = ProgressHook{fn, context};
}

namespace {

// The scanner's one switch on the class of the current byte.
VX_TOKEN scan_token() {
    for (;;) {
        char* p = vrx_scan_cur;
        switch (vrx_byte_class(p)) {
            case VX_BC_CR:
                if (!crlf_at(p, p)) return scan_word(p, p + 1);
                [[fallthrough]];
            case VX_BC_BLANK:
            case VX_BC_LINE_END:
                vrx_scan_cur = skip_space(p);
                break;
            case VX_BC_SEPARATOR:
                vrx_scan_cur = p + 1;
                return vrx_separator_token(*p);
            case VX_BC_DIGIT:
                return scan_number(p);
            case VX_BC_WORD:
                if (*p == '/' && starts_comment(p)) {
                    skip_comment(p);
                    break;
                }
                return scan_word(p, p + 1);
            case VX_BC_QUOTE:
                if (scan_quoted(p)) return VX_TOK_STRING;
                if (sc.stopped) return VX_TOK_END;
                break;
            case VX_BC_NUL:
                if (p != sc.lim) {
                    vrx_scan_cur = p + 1;
                    vrx_parse_error("invalid NUL byte in input");
                    if (vrx_run_ended()) return VX_TOK_END;
                } else if (refill(p) > 0) {
                    vrx_scan_cur = p;
                } else {
                    discard_buffer();
                    return VX_TOK_END;
                }
                break;
        }
    }
}

}  // namespace

VX_TOKEN vrx_scan_token(char* p) {
    if (sc.stopped) {
        discard_buffer();
        return VX_TOK_END;
    }
    vrx_scan_cur = p;
    if (!sc.buf && !create_buffer()) return VX_TOK_END;
    const VX_TOKEN token = scan_token();
    // The buffer stays until the next call, which reports the end of input.
    if (sc.stopped) vrx_scan_cur = no_data;
    return token;
}
