// The output layer: every byte of a written netlist passes through here.
//
// Lines end in "\r\n". An item that would carry a line past column 79 starts
// a new line instead; the writer never breaks inside an item. A pair (two
// texts written together) may reach column 80. Constructs open with " {" and
// close with "}" on a line of its own, indented three spaces per level.
//
// Names become tokens that read back as the same name: quoted when they are
// a statement keyword or hold a byte that would end or split a bare word,
// invented ("OBJ_$" and the object's identity) when absent or empty.
#include <algorithm>
#include <charconv>
#include <climits>
#include <cstdarg>
#include <cstring>

#include "hx_property.h"
#include "ut_nch_cache.h"
#include "vrx.h"
#include "vx_write_internal.h"

namespace {

constexpr int32_t kLineLimit = 79;
constexpr std::string_view kLineEnd = "\r\n";
constexpr std::string_view kIndentUnit = "   ";

// The statement keywords that the writer emits, exact case. Made on first
// use and kept for the life of the process.
UT_NCH_CACHE* keyword_cache = nullptr;

// The latest hierarchical name with ".TRANSPARENT"; grows as needed.
std::string hiername_buffer;
// The line that write_indent assembles; kept to avoid an allocation per line.
std::string line_buffer;

bool fatal_seen = false;

const UT_NCH_CACHE& keyword_set() {
    if (keyword_cache == nullptr) {
        keyword_cache = new UT_NCH_CACHE(0);
        for (const char* k : {"DESIGN", "BLOCK", "PHYSBLOCK", "PRIM", "PHYSPRIM", "SIGNAL",
                              "PHYSSIGNAL", "PIN", "MAPSIGNAL", "MAPCONN"})
            keyword_cache->add(k, 1);
    }
    return *keyword_cache;
}

bool is_keyword(const char* name) {
    // Every keyword starts with one of these letters and has 3 to 10 bytes;
    // most names fail this test before the set is asked.
    switch (name[0]) {
        case 'B': case 'D': case 'M': case 'P': case 'S': break;
        default: return false;
    }
    return keyword_set().find(name) != nullptr;
}

// Bytes that a bare word cannot hold: blanks, line feeds and separators end
// or split it. The first four are the format's own quoting rule; the others
// would otherwise break the written file.
struct QuoteBytes {
    bool table[256] = {};
    constexpr QuoteBytes() {
        for (unsigned char c : {' ', '(', ')', '=', '\t', '\n', '{', '}'}) table[c] = true;
    }
};
constexpr QuoteBytes kQuoteBytes;

bool needs_quotes(const char* name) {
    const auto* p = reinterpret_cast<const unsigned char*>(name);
    bool digits = true;
    std::size_t n = 0;
    for (; p[n] != 0; ++n) {
        if (kQuoteBytes.table[p[n]]) return true;
        digits = digits && p[n] >= '0' && p[n] <= '9';
    }
    // "//" would start a comment; a digit run with a leading zero would read
    // back as a number without it.
    if (name[0] == '/' && name[1] == '/') return true;
    return digits && n > 1 && name[0] == '0';
}

std::string quoted(const char* name) {
    std::string out;
    out.reserve(std::strlen(name) + 2);
    out += '"';
    out += name;
    out += '"';
    return out;
}

}  // namespace

// --- shared helpers ------------------------------------------------------------

void vx_write_fatal(int line, const char* format, ...) {
    fatal_seen = true;
    std::va_list args;
    va_start(args, format);
    const std::string text = UT_STR::VFormat(format, args);
    va_end(args);
    vx_write_msg(line).issueFatal(2, "%s", text.c_str());
}

bool vx_write_fatal_seen() { return fatal_seen; }
void vx_write_reset_fatal() { fatal_seen = false; }

void vx_append_invented(std::string& out, const void* object) {
    char digits[16];
    const auto r = std::to_chars(digits, digits + sizeof digits, vx_identity(object), 16);
    out += "OBJ_$";
    out.append(digits, r.ptr);
}

void vx_append_int(std::string& out, long long value) {
    char digits[24];
    const auto r = std::to_chars(digits, digits + sizeof digits, value);
    out.append(digits, r.ptr);
}

// --- bytes and columns -----------------------------------------------------------

namespace {

int32_t advance(int32_t column, std::size_t count) {
    const long long next = static_cast<long long>(column) + static_cast<long long>(count);
    return next > INT32_MAX ? INT32_MAX : static_cast<int32_t>(next);
}

}  // namespace

void VRX::write_line_end() {
    out_stream->write(kLineEnd.data(), kLineEnd.size());
    column = 0;
}

void VRX::write_item(std::string_view item) {
    if (static_cast<long long>(item.size()) + column > kLineLimit) write_line_end();
    out_stream->write(item.data(), item.size());
    column = advance(column, item.size());
}

void VRX::write_pair(std::string_view first, std::string_view second) {
    const long long total = static_cast<long long>(first.size()) + second.size() + column;
    if (total > kLineLimit && total != kLineLimit + 1) write_line_end();
    out_stream->write(first.data(), first.size());
    if (second == kLineEnd) {
        write_line_end();
        return;
    }
    out_stream->write(second.data(), second.size());
    column = advance(column, first.size() + second.size());
}

void VRX::write_string(const char* first, const char* second) {
    if (first == nullptr) {
        if (second == nullptr) return;
        out_stream->write(second, std::strlen(second));
        column = advance(column, std::strlen(second));
        return;
    }
    if (first == kLineEnd) {
        write_line_end();
        if (second != nullptr) {
            out_stream->write(second, std::strlen(second));
            column = advance(column, std::strlen(second));
        }
        return;
    }
    if (second == nullptr)
        write_item(first);
    else
        write_pair(first, second);
}

void VRX::write_indent(int32_t count, const char* word1, const char* word2, const char* word3,
                       const char* word4) {
    const char* words[4] = {word1, word2, word3, word4};
    count = std::clamp(count, 0, 4);
    line_buffer.clear();
    for (int16_t level = 0; level < indent; ++level) line_buffer += kIndentUnit;
    for (int32_t i = 0; i < count; ++i) {
        const char* word = words[i];
        if (word == nullptr || word == kLineEnd) continue;
        if (i > 0) line_buffer += ' ';
        line_buffer += word;
    }
    const char* last = count > 0 ? words[count - 1] : nullptr;
    if (last != nullptr && last == kLineEnd)
        write_pair(line_buffer, kLineEnd);
    else
        write_item(line_buffer);
}

void VRX::begin_construct() {
    write_item(" ");
    write_pair("{", kLineEnd);
    ++indent;
}

void VRX::end_construct() {
    --indent;
    write_indent(2, "}", "\r\n");
}

// --- names -----------------------------------------------------------------------

VX_LEGALNAME VRX::quote_kwd(const char* name) {
    if (name != nullptr && is_keyword(name)) return VX_LEGALNAME::own(quoted(name));
    return VX_LEGALNAME::refer(vx_text(name));
}

VX_LEGALNAME VRX::vrx_legal(const char* name, const void* object) {
    if (vx_present(name)) return needs_quotes(name) ? VX_LEGALNAME::own(quoted(name)) : quote_kwd(name);
    if (object == nullptr) return VX_LEGALNAME::refer("\"\"");
    std::string invented;
    vx_append_invented(invented, object);
    return VX_LEGALNAME::own(std::move(invented));
}

const char* VRX::build_hiername(HX_BLOCK* block) {
    HX_PROPERTY* transparent = block->find_prop("TRANSPARENT");
    if (transparent == nullptr) return block->get_hiername();
    // The name is taken while the block carries no TRANSPARENT; the property
    // comes back as a flag.
    block->delete_prop(transparent);
    hiername_buffer = block->get_hiername();
    hiername_buffer += ".TRANSPARENT";
    block->create_prop("TRANSPARENT", HX_PROP_FLAG);
    return hiername_buffer.c_str();
}
