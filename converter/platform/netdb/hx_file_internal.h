// What the parts of the database file code share: the layout's constants,
// large buffers and the progress hook. Private to the database; not installed.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "hx_file.h"

namespace hx_file_internal {

constexpr const char* kRevision = "$Revision: 1.0 $";
constexpr std::size_t kMagicSize = 8;
constexpr char kDesignMagic[kMagicSize + 1] = "\x89HXDSGN\n";
constexpr char kLibraryMagic[kMagicSize + 1] = "\x89HXLIBR\n";
constexpr std::size_t kChecksumEnd = 12;  // the checksum covers every byte from here on
constexpr uint32_t kAbsent = 0xFFFFFFFF;
// A global signal's connection to a pin's inner side has this bit in the
// block index; merging a block's signal into a global one puts it there.
constexpr uint32_t kInnerSide = 0x80000000;

// Record flags.
constexpr uint8_t kProps = 1;  // the object's properties are in the property section
constexpr uint8_t kNamed = 2;  // pins: a name follows

// Targets of object properties.
enum ObjectKind : uint8_t {
    kObjNone,
    kObjLibrary,
    kObjDesign,
    kObjBlock,
    kObjPin,
    kObjSignal,
    kObjNetwork,
    kObjMap,
};

// Smallest encoded sizes, for checking counts against the bytes left.
constexpr std::size_t kMinString = 4;
constexpr std::size_t kMinPin = 4;
constexpr std::size_t kMinBlock = 10 + kMinString;
constexpr std::size_t kMinSignal = 9 + kMinString;
constexpr std::size_t kMinConn = 6;
constexpr std::size_t kMinNetwork = 9;
constexpr std::size_t kMinMap = 11 + kMinString;
constexpr std::size_t kMinParents = 8;
constexpr std::size_t kMinDesign = kMinString + 25;
constexpr std::size_t kMinAlias = kMinString + 4;
constexpr std::size_t kMinProp = kMinString + 1;

inline uint32_t load_le32(const uint8_t* p) {
    return uint32_t{p[0]} | uint32_t{p[1]} << 8 | uint32_t{p[2]} << 16 | uint32_t{p[3]} << 24;
}

// --- large buffers ---------------------------------------------------------------
// Buffers that grow with the design go on huge pages where the system offers
// them: page faults and TLB misses are a large part of the cost otherwise.

constexpr std::size_t kHugePage = std::size_t{2} << 20;
constexpr std::size_t kLarge = kHugePage / 2;

void* big_alloc(std::size_t bytes);
void big_free(void* p, std::size_t bytes);

template <class T>
struct BigAlloc {
    using value_type = T;
    BigAlloc() = default;
    template <class U>
    BigAlloc(const BigAlloc<U>&) {}
    T* allocate(std::size_t n) { return static_cast<T*>(big_alloc(n * sizeof(T))); }
    void deallocate(T* p, std::size_t n) { big_free(p, n * sizeof(T)); }
    bool operator==(const BigAlloc&) const { return true; }
};

template <class T>
using BigVector = std::vector<T, BigAlloc<T>>;

// --- progress --------------------------------------------------------------------

struct ProgressHook {
    HX_FILE_PROGRESS_FN fn = nullptr;
    void* context = nullptr;

    void report(uint64_t done, uint64_t total) const {
        if (fn != nullptr) fn(context, done, total);
    }
};

extern ProgressHook progress_hook;

// Records decoded between two progress reports: a few milliseconds' work.
constexpr uint32_t kRecordsPerReport = 65536;

}  // namespace hx_file_internal
