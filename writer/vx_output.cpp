// The output layer: every byte of a written netlist passes through here.
//
// Lines end in "\r\n". An item that would carry a line past column 79 starts
// a new line instead; the writer never breaks inside an item. A pair (two
// texts written together) may reach column 80. Constructs open with " {" and
// close with "}" on a line of its own, indented three spaces per level.
//
// Progress is reported every few thousand constructs closed, as the bytes
// that reached the file so far; nothing is counted per byte.
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
// Constructs closed between two progress reports (a power of two): some
// hundred kilobytes of text.
constexpr uint32_t kConstructsPerReport = 4096;

// The statement keywords that the writer emits, exact case. Made on first
// use and kept for the life of the process.
UT_NCH_CACHE* keyword_cache = nullptr;

// The latest hierarchical name with ".TRANSPARENT"; grows as needed.
std::string hiername_buffer;
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
        case 'B':
        case 'D':
        case 'M':
        case 'P':
        case 'S':
            break;
        default:
            return false;
    }
    return keyword_set().find(name) != nullptr;
}

// Byte classes for names. A bare word cannot hold blanks, line feeds or
// separators: they end or split it. The first four of those are the
// format's own quoting rule; the others would otherwise break the file.
// A carriage return cannot stand in a bare word either. A double quote can
// stand nowhere: such a name is written bare as ever, and noted.
enum : unsigned char { kStop = 1, kNotDigit = 2, kUnreadable = 4 };
struct NameBytes {
    unsigned char table[256] = {};
    constexpr NameBytes() {
        for (int c = 0; c < 256; ++c)
            table[c] = (c >= '0' && c <= '9') ? 0 : kNotDigit;
        table[0] |= kStop;
        for (unsigned char c : {' ', '(', ')', '=', '\t', '\n', '{', '}', '\r'})
            table[c] |= kStop;
        table[static_cast<unsigned char>('"')] |= kUnreadable;
    }
};
constexpr NameBytes kNameBytes;

// True when the name cannot stand bare; `length` receives its length and
// `unreadable` whether the bare word would not read back as the name.
bool needs_quotes(const char* name, std::size_t& length, bool& unreadable) {
    const auto* p = reinterpret_cast<const unsigned char*>(name);
    unsigned char seen = 0;
    std::size_t n = 0;
    while (!(kNameBytes.table[p[n]] & kStop))
        seen |= kNameBytes.table[p[n++]];
    if (p[n] != 0) return true;
    length = n;
    unreadable = (seen & kUnreadable) != 0 || n > static_cast<std::size_t>(VX_MAX_TEXT);
    // "//" would start a comment; a digit run with a leading zero would read
    // back as a number without it.
    if (name[0] == '/' && name[1] == '/') return true;
    return !(seen & kNotDigit) && n > 1 && name[0] == '0';
}

// Whether the quoted text reads back as `name`: no quote can sit inside
// one, a CR LF inside one reads as LF, and the reader takes 1024 bytes.
bool readable_quoted(const char* name, std::size_t length) {
    if (length + 2 > VX_MAX_TEXT) return false;
    const char* cr = std::strchr(name, '\r');
    return std::strchr(name, '"') == nullptr &&
           (cr == nullptr || std::strstr(cr, "\r\n") == nullptr);
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

bool vx_write_fatal_seen() {
    return fatal_seen;
}
void vx_write_reset_fatal() {
    fatal_seen = false;
}

void vx_append_invented(std::string& out, uint32_t identity) {
    char digits[16];
    const auto r = std::to_chars(digits, digits + sizeof digits, identity, 16);
    out += "OBJ_$";
    out.append(digits, r.ptr);
}

void vx_append_int(std::string& out, long long value) {
    char digits[24];
    const auto r = std::to_chars(digits, digits + sizeof digits, value);
    out.append(digits, r.ptr);
}

// --- bytes and columns -----------------------------------------------------------

void VRX::write_line_end() {
    out_stream->write(kLineEnd.data(), kLineEnd.size());
    column = 0;
}

// The line-length rule. An item may bring the line to 79; a pair to 80
// (81 and beyond break). A break comes even at column 0, so an overlong
// item at the start of a line is preceded by an empty line.
void VRX::break_before(std::size_t length, bool pair) {
    const long long total = static_cast<long long>(length) + column;
    if (total > kLineLimit && !(pair && total == kLineLimit + 1)) write_line_end();
}

void VRX::write_item(std::string_view item) {
    break_before(item.size(), false);
    put(item);
}

void VRX::write_pair(std::string_view first, std::string_view second) {
    break_before(first.size() + second.size(), true);
    put(first);
    if (second == kLineEnd)
        write_line_end();
    else
        put(second);
}

// A pair whose two texts are given joined: the same bytes and the same break
// as writing them as a pair (or, with `pair` clear, as one item).
void VRX::write_joined(std::string_view bytes, bool pair) {
    break_before(bytes.size(), pair);
    put(bytes);
}

// The pair of `text` and a line end, in one write for the short texts that
// close lists.
void VRX::end_line(std::string_view text) {
    break_before(text.size() + kLineEnd.size(), true);
    char line[16];
    if (text.size() + kLineEnd.size() <= sizeof line) {
        std::memcpy(line, text.data(), text.size());
        std::memcpy(line + text.size(), kLineEnd.data(), kLineEnd.size());
        out_stream->write(line, text.size() + kLineEnd.size());
    } else {
        out_stream->write(text.data(), text.size());
        out_stream->write(kLineEnd.data(), kLineEnd.size());
    }
    column = 0;
}

void VRX::write_string(const char* first, const char* second) {
    if (first == nullptr) {
        if (second != nullptr) put(second);
        return;
    }
    if (first == kLineEnd) {
        write_line_end();
        if (second != nullptr) put(second);
        return;
    }
    if (second == nullptr)
        write_item(first);
    else
        write_pair(first, second);
}

// One indented line, or the start of one: the indentation, then the present
// words, each after one space unless it stands first. A last word "\r\n" ends
// the line (the pair rule); otherwise the line stays open for the caller.
// The pieces go out one by one; their wrap decision is that of the whole line.
void VRX::write_indent(int32_t count, std::string_view word1, std::string_view word2,
                       std::string_view word3, std::string_view word4) {
    const std::string_view words[4] = {word1, word2, word3, word4};
    count = std::clamp(count, 0, 4);
    const int levels = indent > 0 ? indent : 0;
    std::size_t length = static_cast<std::size_t>(levels) * kIndentUnit.size();
    auto skipped = [](std::string_view w) { return w.data() == nullptr || w == kLineEnd; };
    for (int32_t i = 0; i < count; ++i)
        if (!skipped(words[i])) length += words[i].size() + (i > 0 ? 1 : 0);
    const bool ends =
        count > 0 && words[count - 1].data() != nullptr && words[count - 1] == kLineEnd;
    break_before(length + (ends ? kLineEnd.size() : 0), ends);
    put_indent(levels);
    for (int32_t i = 0; i < count; ++i) {
        if (skipped(words[i])) continue;
        if (i > 0) put(" ");
        put(words[i]);
    }
    if (ends) write_line_end();
}

void VRX::put_indent(int levels) {
    static const std::string spaces(kIndentUnit.size() * 32, ' ');
    for (; levels > 32; levels -= 32)
        put(spaces);
    put(std::string_view(spaces).substr(0, kIndentUnit.size() * static_cast<std::size_t>(levels)));
}

void VRX::begin_construct() {
    write_item(" ");
    write_pair("{", kLineEnd);
    ++indent;
}

void VRX::end_construct() {
    --indent;
    write_indent(2, "}", "\r\n");
    if ((++constructs_written & (kConstructsPerReport - 1)) == 0) report_write_progress(false);
}

// The size is what left the stream's buffer so far; once the file is
// complete, it is the total too.
void VRX::report_write_progress(bool complete) {
    if (progress_fn == nullptr) return;
    const std::uint64_t size = out_stream->bytes_written();
    report_progress(size, complete ? size : 0);
}

// --- names -----------------------------------------------------------------------

VX_LEGALNAME VRX::quote_kwd(const char* name) {
    if (name != nullptr && is_keyword(name)) return VX_LEGALNAME::own(quoted(name));
    return VX_LEGALNAME::refer(vx_text(name));
}

// The text of such a name is written all the same (the rest of the file is
// good); vrx_write tells how many there were and the first, once.
void VRX::note_unreadable(std::string_view text) {
    if (unreadable_names++ == 0) first_unreadable = text;
}

VX_LEGALNAME VRX::vrx_legal(const char* name, const void* object) {
    if (vx_present(name)) {
        std::size_t length = 0;
        bool unreadable = false;
        if (needs_quotes(name, length, unreadable)) {
            if (!readable_quoted(name, std::strlen(name))) note_unreadable(name);
            return VX_LEGALNAME::own(quoted(name));
        }
        if (unreadable) note_unreadable(name);
        if (is_keyword(name)) return VX_LEGALNAME::own(quoted(name));
        return VX_LEGALNAME::refer(std::string_view(name, length));
    }
    if (object == nullptr) return VX_LEGALNAME::refer("\"\"");
    std::string invented;
    vx_append_invented(invented, invented_identity(object));
    return VX_LEGALNAME::own(std::move(invented));
}

// Numbered in the order first named: unique within one vrx_write and the
// same on every run over the same database, which addresses are not.
uint32_t VRX::invented_identity(const void* object) {
    const auto next = static_cast<uint32_t>(invented_ids.size() + 1);
    return invented_ids.try_emplace(object, next).first->second;
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
