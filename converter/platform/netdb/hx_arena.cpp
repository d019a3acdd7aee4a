// Arenas: the chunks that a design's objects and names are carved from.
#include <sys/mman.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <new>

#include "hx_storage.h"

void* HX_ARENA::alloc(std::size_t size, std::size_t align) {
    std::size_t pad = (align - reinterpret_cast<uintptr_t>(cur_) % align) % align;
    if (cur_ == nullptr || pad + size > left_) {
        make_room(size, align);
        pad = (align - reinterpret_cast<uintptr_t>(cur_) % align) % align;
    }
    std::byte* result = cur_ + pad;
    cur_ = result + size;
    left_ -= pad + size;
    return result;
}

namespace {

constexpr std::size_t kPage = 4096;
constexpr std::size_t kHugePage = std::size_t{2} << 20;
constexpr std::size_t kLargestChunk = std::size_t{4} << 20;
// Chunks from this size on are mapped directly and faulted in by windows.
constexpr std::size_t kMappedChunk = std::size_t{64} << 10;
constexpr std::size_t kFaultWindow = std::size_t{64} << 10;
// An arena turns to huge pages (4 MiB chunks) only once it holds this much,
// so that a small design does not fault in a mostly empty huge page.
constexpr std::size_t kHugeFrom = std::size_t{2} << 20;

std::byte* map_pages(std::size_t size, std::size_t align) {
    void* base = mmap(nullptr, size + align - kPage, PROT_READ | PROT_WRITE,
                      MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (base == MAP_FAILED) throw std::bad_alloc();
    auto* raw = static_cast<std::byte*>(base);
    auto* start = reinterpret_cast<std::byte*>((reinterpret_cast<uintptr_t>(raw) + align - 1) &
                                               ~(uintptr_t{align} - 1));
    if (start != raw) munmap(raw, static_cast<std::size_t>(start - raw));
    const std::size_t tail = static_cast<std::size_t>(raw + size + align - kPage - start) - size;
    if (tail > 0) munmap(start + size, tail);
    return start;
}

}  // namespace

HX_ARENA::~HX_ARENA() {
    for (Chunk* chunk = last_; chunk != nullptr;) {
        Chunk* prev = chunk->prev;
        if (chunk->mapped) {
            munmap(chunk, chunk->size);
        } else {
            std::free(chunk);
        }
        chunk = prev;
    }
}

// Starts a new chunk when the request does not fit the current one, and
// faults in the pages it needs a window at a time: one call for many pages
// costs much less than a page fault per page.
void HX_ARENA::make_room(std::size_t size, std::size_t align) {
    const std::size_t need = size + align;
    if (cur_ == nullptr || static_cast<std::size_t>(chunk_end_ - cur_) < need) grow(need);
    if (left_ >= need) return;
    std::byte* ready = cur_ + left_;
    auto* want = reinterpret_cast<std::byte*>(
        (reinterpret_cast<uintptr_t>(cur_ + std::max(need, left_ + kFaultWindow)) + kPage - 1) &
        ~(uintptr_t{kPage} - 1));
    want = std::min(chunk_end_, want);
#ifdef MADV_POPULATE_WRITE
    madvise(ready, static_cast<std::size_t>(want - ready), MADV_POPULATE_WRITE);
#endif
    left_ = static_cast<std::size_t>(want - cur_);
}

// Each chunk starts with its Chunk record, which links it to the one before.
void HX_ARENA::grow(std::size_t at_least) {
    std::size_t size = std::max(next_chunk_, at_least + sizeof(Chunk));
    const bool mapped = size >= kMappedChunk;
    std::byte* start = nullptr;
    if (!mapped) {
        start = static_cast<std::byte*>(std::malloc(size));
        if (start == nullptr) throw std::bad_alloc();
        left_ = size;
    } else if (reserved_ >= kHugeFrom && size % kHugePage == 0) {
        start = map_pages(size, kHugePage);
#ifdef MADV_HUGEPAGE
        madvise(start, size, MADV_HUGEPAGE);
#endif
        left_ = size;  // a fault per huge page is cheap enough
    } else {
        size = (size + kPage - 1) & ~(kPage - 1);
        start = map_pages(size, kPage);
        left_ = sizeof(Chunk);  // make_room faults in the rest as it is used
    }
    last_ = new (start) Chunk{last_, size, mapped};
    cur_ = start + sizeof(Chunk);
    left_ -= sizeof(Chunk);
    chunk_end_ = start + size;
    reserved_ += size;
    next_chunk_ = std::min(next_chunk_ * 2, kLargestChunk);
}
