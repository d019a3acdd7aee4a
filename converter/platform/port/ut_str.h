// Text helpers of the portability library: comparison, copies, bounded
// composition and printf-style formatting of any length.
//
// Absent texts (null pointers) are accepted everywhere: an absent text has
// length 0, compares equal only to another absent text and sorts before every
// present text, the empty one included. Nothing here ever writes past a
// buffer: the composing functions take the destination's size and report
// truncation instead of overflowing.
#pragma once

#include <cstdarg>
#include <cstddef>
#include <string>

#if defined(__GNUC__)
#define UT_PRINTF_FORMAT(fmt_index, first_arg) __attribute__((format(printf, fmt_index, first_arg)))
#else
#define UT_PRINTF_FORMAT(fmt_index, first_arg)
#endif

class UT_STR {
  public:
    /// strcmp order; 0 when equal. See the file comment for absent texts.
    static int Compare(const char* a, const char* b);
    /// A new copy released with delete[]; null for an absent text.
    static char* Dup(const char* s);
    /// Byte count without the terminator; 0 for an absent text.
    static std::size_t Len(const char* s);
    static bool ContainsChar(const char* s, char c);
    /// Equal when ASCII letters are compared without regard to case.
    static bool EqualNoCase(const char* a, const char* b);
    /// A copy with ASCII capitals made small (empty for an absent text).
    static std::string FoldCase(const char* s);

    /// Copies src into dst (size bytes, terminator included). Returns false,
    /// with dst holding the truncated text, when src does not fit.
    static bool Copy(char* dst, std::size_t size, const char* src);
    /// Appends src to the text in dst; false when truncated, as Copy.
    static bool Cat(char* dst, std::size_t size, const char* src);
    /// snprintf that reports truncation as false.
    static bool SPrintf(char* dst, std::size_t size, const char* format, ...)
        UT_PRINTF_FORMAT(3, 4);

    template <std::size_t N>
    static bool Copy(char (&dst)[N], const char* src) {
        return Copy(dst, N, src);
    }
    template <std::size_t N>
    static bool Cat(char (&dst)[N], const char* src) {
        return Cat(dst, N, src);
    }

    /// The whole formatted text, whatever its length.
    static std::string Format(const char* format, ...) UT_PRINTF_FORMAT(1, 2);
    static std::string VFormat(const char* format, std::va_list args);
};

/// Formats into a buffer owned by the library; the text stays valid until the
/// next call on the same thread. The arguments may point into the text of the
/// previous call.
const char* vonform(const char* format, ...) UT_PRINTF_FORMAT(1, 2);

/// Releases an array made by UT_DARRAY::a_makearray (null is allowed).
void von_free(void* array);
