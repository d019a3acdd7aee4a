// Iterators over the lists that the netlist database keeps. The owner makes
// and releases them in pairs (create_*_iter / delete_*_iter); l_next gives
// the next element, or null at the end.
//
// Both walk a std::vector of object pointers by position, so elements
// appended during the walk are visited and the vector may grow meanwhile.
// UT_BLISTS_ITER also skips null entries: lists whose removals leave holes
// until the owner compacts them.
#pragma once

#include <cstddef>
#include <utility>
#include <vector>

template <class T>
class UT_BLIST_ITER {
  public:
    explicit UT_BLIST_ITER(const std::vector<T*>& list) : list_(&list) {}
    /// Walks a list composed for this walk, which the iterator keeps.
    explicit UT_BLIST_ITER(std::vector<T*>&& items) : owned_(std::move(items)), list_(&owned_) {}
    UT_BLIST_ITER(const UT_BLIST_ITER&) = delete;
    UT_BLIST_ITER& operator=(const UT_BLIST_ITER&) = delete;

    T* l_next() { return pos_ < list_->size() ? (*list_)[pos_++] : nullptr; }

  private:
    std::vector<T*> owned_;
    const std::vector<T*>* list_;
    std::size_t pos_ = 0;
};

template <class T>
class UT_BLISTS_ITER {
  public:
    explicit UT_BLISTS_ITER(const std::vector<T*>& list) : list_(&list) {}
    T* l_next() {
        while (pos_ < list_->size()) {
            T* item = (*list_)[pos_++];
            if (item != nullptr) return item;
        }
        return nullptr;
    }

  private:
    const std::vector<T*>* list_;
    std::size_t pos_ = 0;
};
