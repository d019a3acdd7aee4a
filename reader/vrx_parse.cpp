// The parser: checks the token stream against the grammar and makes one
// callback per complete statement. It builds nothing and looks nothing up.
//
// Grammar (production numbers in the comments below refer to it):
//   1 netlist_file : library_props design_list
//   2 library_props: prop_list                                  do_library_props
//   3 design_list  : design_stmt            4 | design_list design_stmt
//   5 design_stmt  : design_head { block_list signal_list map_list }   end_design
//   6              | DESIGN name_item name_item { }             add_alias
//   7 design_head  : DESIGN name_item prop_list                 begin_design
//   8 block_list   : block_stmt             9 | block_list block_stmt
//  10 block_stmt   : block_head { pin_part }                    end_block
//  11              | block_head                                 end_block
//  12 block_head   : block_kw name_item NUMBER prop_list        begin_block
//  13              | block_kw name_item prop_list               begin_block
//  14              | prim_kw name_item NUMBER prop_list         begin_prim
//  15              | prim_kw name_item prop_list                begin_prim
//  16-19 block_kw : BLOCK | PHYSBLOCK,  prim_kw : PRIM | PHYSPRIM
//  20 pin_part     : (empty)               21 | pin_list
//  22 pin_list     : pin_stmt              23 | pin_list pin_stmt
//  24 pin_stmt     : PIN name_item prop_list                    do_pin
//  25 signal_list  : (empty)               26 | signal_list signal_stmt
//  27 signal_stmt  : signal_kw name_item prop_list              do_signal
//  28-29 signal_kw : SIGNAL | PHYSSIGNAL
//  30 map_list     : (empty)               31 | map_list map_group
//  32 map_group    : map_head map_body
//  33 map_head     : MAPSIGNAL name_item                        do_mapsignal(name, null, null)
//  34              | MAPSIGNAL name_item name_item prop_list    do_mapsignal
//  35 map_body     : { mapconn_list }
//  36 mapconn_list : (empty)               37 | mapconn_list mapconn_stmt
//  38 mapconn_stmt : MAPCONN name_item name_item prop_list      add_mapconn
//  39              | MAPCONN name_item prop_list                add_mapconn(name, null, list)
//  40 prop_list    : (empty)                                    count := 0
//  41              | ( prop_items )
//  42 prop_items   : (empty)                                    count := 0
//  43              | prop_items prop_item                       append
//  44 prop_item    : name_item             45 | name_item = name_item
//  46 name_item    : STRING                47 | NUMBER (as "%d" text)
//
// Action timing. The reference behaviour is that of a table-driven LALR(1)
// parser with default reductions. Every state of this grammar's automaton is
// of one of three kinds, and each kind has its code shape here:
//  - A single reduction and no shift. The table parser reduces without reading
//    a look-ahead. These are the states right behind a name token (46, 47),
//    a block or signal keyword (16 to 19, 28, 29), a "=" value (45), a ")" or
//    "}" that ends a production, and behind "(" (which reduces the empty
//    prop_items, 42, at once). Here: plain code after `shift()`.
//  - Shifts and one default reduction. The parser reads a look-ahead; a token
//    that shifts continues the production, any other token, valid or not,
//    takes the default reduction. These are the places where an optional part
//    may follow. Here: `peek()` and an `if` whose else branch is the reduction.
//  - Shifts only. The parser reads a look-ahead and reports "parse error" when
//    it does not shift. Here: `peek()`, then `syntax_error()` on a mismatch.
// So a statement closed by ")" or "}" reaches its callback before the next
// token is read, and one that ends in an absent optional part once the next
// token has been read, also when that token is a syntax error: errors surface
// only in shift-only states, after every default reduction (and its action)
// on the offending token. No state holds two reductions, so no reduction ever
// depends on which token the look-ahead is.
//
// Lists are loops and the call depth is fixed, so there is no parser stack
// that could overflow: `vrx_parse` returns 0 or 1, never 2.
//
// When the run is to end (the error limit, or a fatal scanner stop) and the
// host's exit handler returns, the parser stops at once: it reads no further
// token, makes no further callback or report, and returns 1.
#include <cstdio>
#include <cstring>

#include "vrx_parser.h"
#include "vrx_scan.h"

VX_PROP_ARRAY prop_array;

namespace {

// Stands for the look-ahead once the run has ended; no state shifts it.
constexpr auto kStopped = static_cast<VX_TOKEN>(-1);

bool is_name(VX_TOKEN t) {
    return t == VX_TOK_STRING || t == VX_TOK_NUMBER;
}

bool is_block_kw(VX_TOKEN t) {
    return t == VX_TOK_BLOCK || t == VX_TOK_PHYSBLOCK || t == VX_TOK_PRIM || t == VX_TOK_PHYSPRIM;
}

bool is_signal_kw(VX_TOKEN t) {
    return t == VX_TOK_SIGNAL || t == VX_TOK_PHYSSIGNAL;
}

// The STRING token's text into a name buffer. Most names are short: one
// fixed-size block copy, then the terminator.
void copy_text(char* out) {
    static_assert(VX_TEXT_BLOCK <= VX_MAX_TEXT + 1);
    const std::size_t length = token_value.length;
    if (length < VX_TEXT_BLOCK) {
        std::memcpy(out, token_value.text, VX_TEXT_BLOCK);
    } else {
        std::memcpy(out, token_value.text, length);
    }
    out[length] = '\0';
}

// "%d" of a value from 0 to INT32_MAX.
void format_decimal(int32_t value, char* out) {
    char digits[16];
    int n = 0;
    do {
        digits[n++] = static_cast<char>('0' + value % 10);
        value /= 10;
    } while (value > 0);
    while (n > 0)
        *out++ = digits[--n];
    *out = '\0';
}

// A width travels as 16 bits: a larger number keeps its low 16 bits, which
// would silently give a block of 65536 pins none, so it is reported.
uint16_t width_of(int32_t number) {
    const auto width = static_cast<uint16_t>(number & 0xFFFF);
    if (number > 0xFFFF) {
        char text[112];
        std::snprintf(text, sizeof text, "width %d is above 65535: its low 16 bits, %u, are used%s",
                      number, unsigned(width), width == 0xFFFF ? " (no width)" : "");
        vrx_parse_warning(text);
    }
    return width;
}

class Parser {
  public:
    int32_t run();

  private:
    [[gnu::always_inline]] VX_TOKEN peek();
    void shift() { have_lookahead_ = false; }
    bool syntax_error();
    template <typename Callback, typename... Args>
    void act(Callback callback, Args... args);

    [[gnu::always_inline]] void take_name(char* out);
    bool prop_list();
    bool prop_item();
    void append_prop();
    bool design_stmt();
    bool alias_stmt();
    bool design_body();
    bool block_stmt();
    bool pin_stmt();
    bool signal_stmt();
    bool map_group();
    bool mapconn_stmt();

    VX_TOKEN lookahead_ = VX_TOK_END;
    bool have_lookahead_ = false;
    // The names a statement holds until its action; property texts go straight
    // into `prop_array`, or into `dropped_` once the list is full.
    char first_[VX_MAX_TEXT + 1];
    char second_[VX_MAX_TEXT + 1];
    VX_PROP dropped_;
};

// Reads a token only when none is held, as the table parser does in every
// state that has a shift.
inline VX_TOKEN Parser::peek() {
    if (vrx_run_ended()) return kStopped;
    if (!have_lookahead_) {
        lookahead_ = vrx_next_token();
        have_lookahead_ = true;
        if (vrx_run_ended()) return kStopped;
    }
    return lookahead_;
}

bool Parser::syntax_error() {
    if (!vrx_run_ended()) vrx_parse_error("parse error");
    return false;
}

template <typename Callback, typename... Args>
void Parser::act(Callback callback, Args... args) {
    if (!vrx_run_ended()) callback(args...);
}

// name_item (46, 47): the held STRING or NUMBER, shifted.
inline void Parser::take_name(char* out) {
    if (lookahead_ == VX_TOK_NUMBER) {
        format_decimal(token_value.number, out);
    } else {
        copy_text(out);
    }
    shift();
}

// prop_list (40, 41) where it is optional: "(" shifts, else the default
// reduction 40. Ends right behind ")" without a look-ahead.
bool Parser::prop_list() {
    if (peek() != VX_TOK_LPAREN) {
        prop_array.count = 0;
        return true;
    }
    shift();
    prop_array.count = 0;  // 42, at once behind "("
    for (;;) {
        const VX_TOKEN t = peek();  // shifts only: a name or ")"
        if (t == VX_TOK_RPAREN) {
            shift();
            return true;
        }
        if (!is_name(t)) return syntax_error();
        if (!prop_item()) return false;
    }
}

// prop_item (44, 45) and its append (43). A name alone is complete only once
// the next token shows no "=", so the append follows that read.
bool Parser::prop_item() {
    const auto count = static_cast<uint32_t>(prop_array.count);
    VX_PROP& prop = count < VX_MAX_PROPS ? prop_array.entries[count] : dropped_;
    take_name(prop.name);
    if (peek() == VX_TOK_EQUALS) {
        shift();
        if (!is_name(peek())) return syntax_error();
        take_name(prop.value);
    } else {
        prop.value[0] = '\0';
    }
    append_prop();
    return true;
}

void Parser::append_prop() {
    if (static_cast<uint32_t>(prop_array.count) < VX_MAX_PROPS) {
        ++prop_array.count;
    } else if (!vrx_run_ended()) {
        vrx_parse_error("maximum property count exceeded");
    }
}

// netlist_file (1): the library's list, then designs up to the end of input.
int32_t Parser::run() {
    if (!prop_list()) return 1;
    act(vrx_do_library_props, &prop_array);  // 2
    if (peek() != VX_TOK_DESIGN) {
        syntax_error();
        return 1;
    }
    do {
        if (!design_stmt()) return 1;
    } while (peek() == VX_TOK_DESIGN);  // else the default reduction 1
    if (peek() != VX_TOK_END) {
        syntax_error();
        return 1;
    }
    return 0;
}

// design_stmt (5, 6, 7) from DESIGN.
bool Parser::design_stmt() {
    shift();
    if (!is_name(peek())) return syntax_error();
    take_name(first_);
    if (is_name(peek())) return alias_stmt();
    if (!prop_list()) return false;
    act(vrx_begin_design, first_, &prop_array);  // 7
    if (peek() != VX_TOK_LBRACE) return syntax_error();
    shift();
    return design_body();
}

// The alias form (6): DESIGN name name { }, no property list.
bool Parser::alias_stmt() {
    take_name(second_);
    if (peek() != VX_TOK_LBRACE) return syntax_error();
    shift();
    if (peek() != VX_TOK_RBRACE) return syntax_error();
    shift();
    act(vrx_add_alias, first_, second_);
    return true;
}

// The design's braces: one or more blocks (8, 9), then signals (25, 26), then
// map groups (30, 31), then "}" (5).
bool Parser::design_body() {
    if (!is_block_kw(peek())) return syntax_error();
    do {
        if (!block_stmt()) return false;
    } while (is_block_kw(peek()));  // else the default reduction 25
    while (is_signal_kw(peek())) {
        if (!signal_stmt()) return false;
    }  // else the default reduction 30
    while (peek() == VX_TOK_MAPSIGNAL) {
        if (!map_group()) return false;
    }
    if (peek() != VX_TOK_RBRACE) return syntax_error();
    shift();
    act(vrx_end_design);
    return true;
}

// block_stmt (10 to 19) from its keyword.
bool Parser::block_stmt() {
    const VX_TOKEN kw = lookahead_;
    shift();
    const bool prim = kw == VX_TOK_PRIM || kw == VX_TOK_PHYSPRIM;
    const uint8_t physical = kw == VX_TOK_PHYSBLOCK || kw == VX_TOK_PHYSPRIM;
    if (!is_name(peek())) return syntax_error();
    take_name(first_);
    uint16_t width = 0xFFFF;
    if (peek() == VX_TOK_NUMBER) {
        width = width_of(token_value.number);
        shift();
    }
    if (!prop_list()) return false;
    act(prim ? vrx_begin_prim : vrx_begin_block, first_, width, physical, &prop_array);
    if (peek() != VX_TOK_LBRACE) {  // the default reduction 11
        act(vrx_end_block);
        return true;
    }
    shift();
    while (peek() == VX_TOK_PIN) {
        if (!pin_stmt()) return false;
    }  // else the default reduction 20 or 21
    if (peek() != VX_TOK_RBRACE) return syntax_error();
    shift();
    act(vrx_end_block);  // 10
    return true;
}

// pin_stmt (24) from PIN.
bool Parser::pin_stmt() {
    shift();
    if (!is_name(peek())) return syntax_error();
    take_name(first_);
    if (!prop_list()) return false;
    act(vrx_do_pin, first_, &prop_array);
    return true;
}

// signal_stmt (27, 28, 29) from its keyword.
bool Parser::signal_stmt() {
    const VX_SIGNAL_TYPE kind = lookahead_ == VX_TOK_SIGNAL ? VX_SIGNAL : VX_PHYSSIGNAL;
    shift();
    if (!is_name(peek())) return syntax_error();
    take_name(first_);
    if (!prop_list()) return false;
    act(vrx_do_signal, first_, kind, &prop_array);
    return true;
}

// map_group (32 to 37) from MAPSIGNAL. The one-name head (33) is complete once
// the token behind the name is not a name: its action runs with that token held.
bool Parser::map_group() {
    shift();
    if (!is_name(peek())) return syntax_error();
    take_name(first_);
    if (is_name(peek())) {
        take_name(second_);
        if (!prop_list()) return false;
        act(vrx_do_mapsignal, first_, static_cast<const char*>(second_), &prop_array);  // 34
    } else {
        act(vrx_do_mapsignal, first_, static_cast<const char*>(nullptr),
            static_cast<VX_PROP_ARRAY*>(nullptr));  // 33
    }
    if (peek() != VX_TOK_LBRACE) return syntax_error();
    shift();  // then 36 at once
    while (peek() == VX_TOK_MAPCONN) {
        if (!mapconn_stmt()) return false;
    }
    if (peek() != VX_TOK_RBRACE) return syntax_error();
    shift();  // 35, 32, 31 at once
    return true;
}

// mapconn_stmt (38, 39) from MAPCONN.
bool Parser::mapconn_stmt() {
    shift();
    if (!is_name(peek())) return syntax_error();
    take_name(first_);
    const bool has_pin = is_name(peek());
    if (has_pin) take_name(second_);
    if (!prop_list()) return false;
    act(vrx_add_mapconn, first_, has_pin ? static_cast<const char*>(second_) : nullptr,
        &prop_array);
    return true;
}

}  // namespace

int32_t vrx_parse() {
    vrx_clear_run_ended();
    Parser parser;
    return parser.run();
}
