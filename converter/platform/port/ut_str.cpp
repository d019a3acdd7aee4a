#include "ut_str.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>

int UT_STR::Compare(const char* a, const char* b) {
    if (a == nullptr || b == nullptr) return (a != nullptr) - (b != nullptr);
    return std::strcmp(a, b);
}

char* UT_STR::Dup(const char* s) {
    if (s == nullptr) return nullptr;
    const std::size_t n = std::strlen(s) + 1;
    char* copy = new char[n];
    std::memcpy(copy, s, n);
    return copy;
}

std::size_t UT_STR::Len(const char* s) {
    return s == nullptr ? 0 : std::strlen(s);
}

bool UT_STR::ContainsChar(const char* s, char c) {
    return s != nullptr && c != '\0' && std::strchr(s, c) != nullptr;
}

namespace {
char fold(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}
}  // namespace

bool UT_STR::EqualNoCase(const char* a, const char* b) {
    if (a == nullptr || b == nullptr) return a == b;
    for (; *a != '\0' && fold(*a) == fold(*b); ++a, ++b) {
    }
    return fold(*a) == fold(*b);
}

std::string UT_STR::FoldCase(const char* s) {
    std::string folded = s ? s : "";
    for (char& c : folded)
        c = fold(c);
    return folded;
}

bool UT_STR::Copy(char* dst, std::size_t size, const char* src) {
    if (size == 0) return src == nullptr || *src == '\0';
    dst[0] = '\0';
    return Cat(dst, size, src);
}

bool UT_STR::Cat(char* dst, std::size_t size, const char* src) {
    if (size == 0) return src == nullptr || *src == '\0';
    const std::size_t used = strnlen(dst, size - 1);
    const std::size_t room = size - 1 - used;
    const std::size_t len = Len(src);
    const std::size_t n = len < room ? len : room;
    if (n > 0) std::memcpy(dst + used, src, n);
    dst[used + n] = '\0';
    return n == len;
}

bool UT_STR::SPrintf(char* dst, std::size_t size, const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    const int n = std::vsnprintf(dst, size, format, args);
    va_end(args);
    return n >= 0 && static_cast<std::size_t>(n) < size;
}

std::string UT_STR::VFormat(const char* format, std::va_list args) {
    char small[256];
    std::va_list again;
    va_copy(again, args);
    const int n = std::vsnprintf(small, sizeof small, format, args);
    std::string text;
    if (n < 0) {
        va_end(again);
        return text;  // an invalid format produces no text
    }
    if (static_cast<std::size_t>(n) < sizeof small) {
        text.assign(small, static_cast<std::size_t>(n));
    } else {
        text.resize(static_cast<std::size_t>(n));
        std::vsnprintf(text.data(), text.size() + 1, format, again);
    }
    va_end(again);
    return text;
}

std::string UT_STR::Format(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    std::string text = VFormat(format, args);
    va_end(args);
    return text;
}

const char* vonform(const char* format, ...) {
    thread_local std::string buffer;
    std::va_list args;
    va_start(args, format);
    // Format into a new string first: an argument may point into `buffer`.
    std::string text = UT_STR::VFormat(format, args);
    va_end(args);
    buffer.swap(text);
    return buffer.c_str();
}

void von_free(void* array) {
    std::free(array);
}
