// Growable arrays. UT_DARRAY holds plain values; a_makearray hands them out
// as one plain array that the caller releases with von_free. DARRAY_NAME holds
// its own copies of texts (absent texts stay absent).
#pragma once

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <type_traits>
#include <vector>

#include "ut_str.h"

template <class T>
class UT_DARRAY {
    static_assert(std::is_trivially_copyable_v<T>, "UT_DARRAY holds plain values");

  public:
    UT_DARRAY() = default;
    explicit UT_DARRAY(std::size_t reserve) { items_.reserve(reserve); }

    void add(const T& value) { items_.push_back(value); }
    std::int32_t count() const { return static_cast<std::int32_t>(items_.size()); }
    const T& operator[](std::int32_t i) const { return items_[static_cast<std::size_t>(i)]; }
    T& operator[](std::int32_t i) { return items_[static_cast<std::size_t>(i)]; }
    void clear() { items_.clear(); }

    /// A copy of the elements as one array, released with von_free; null when empty.
    T* a_makearray() const {
        if (items_.empty()) return nullptr;
        void* array = std::malloc(items_.size() * sizeof(T));
        if (array == nullptr) throw std::bad_alloc();
        std::memcpy(array, items_.data(), items_.size() * sizeof(T));
        return static_cast<T*>(array);
    }

  private:
    std::vector<T> items_;
};

/// Names (file names, pin names), each an owned copy of the text added.
class DARRAY_NAME {
  public:
    DARRAY_NAME() = default;
    DARRAY_NAME(const DARRAY_NAME& other) { *this = other; }
    DARRAY_NAME& operator=(const DARRAY_NAME& other) {
        if (this == &other) return *this;
        clear();
        for (std::int32_t i = 0; i < other.count(); ++i)
            add(other[i]);
        return *this;
    }
    DARRAY_NAME(DARRAY_NAME&&) = default;
    DARRAY_NAME& operator=(DARRAY_NAME&&) = default;

    void add(const char* name) {
        names_.emplace_back(UT_STR::Dup(name));
        view_.add(names_.back().get());
    }
    std::int32_t count() const { return view_.count(); }
    const char* operator[](std::int32_t i) const { return view_[i]; }
    void clear() {
        names_.clear();
        view_.clear();
    }
    /// The names as one array released with von_free. Its pointers refer to this
    /// object's copies and stay valid until it changes or is destroyed.
    const char** a_makearray() const { return view_.a_makearray(); }

  private:
    std::vector<std::unique_ptr<char[]>> names_;
    UT_DARRAY<const char*> view_;
};
