// Checksums of database files, the large buffers that hold them, and the
// progress hook.
#include "hx_file.h"

#include <sys/mman.h>

#include <cstdlib>
#include <cstring>
#include <new>

#include "hx_file_internal.h"

#if defined(__x86_64__) && (defined(__GNUC__) || defined(__clang__))
#include <nmmintrin.h>
#define HX_FILE_HW_CRC 1
#endif

using namespace hx_file_internal;

namespace {

// --- CRC-32C -------------------------------------------------------------------
// Hardware instructions where the processor has them (several GB/s), else
// slicing by 8 tables; both give the same values.

constexpr uint32_t kCrcPolynomial = 0x82F63B78;  // Castagnoli, reflected

struct CrcTables {
    uint32_t t[8][256];
};

constexpr CrcTables make_crc_tables() {
    CrcTables tables{};
    for (uint32_t i = 0; i < 256; ++i) {
        uint32_t crc = i;
        for (int bit = 0; bit < 8; ++bit)
            crc = (crc >> 1) ^ ((crc & 1) ? kCrcPolynomial : 0);
        tables.t[0][i] = crc;
    }
    for (int k = 1; k < 8; ++k) {
        for (uint32_t i = 0; i < 256; ++i) {
            const uint32_t prev = tables.t[k - 1][i];
            tables.t[k][i] = (prev >> 8) ^ tables.t[0][prev & 0xFF];
        }
    }
    return tables;
}

constexpr CrcTables kCrc = make_crc_tables();

uint32_t crc_portable(uint32_t crc, const uint8_t* p, std::size_t n) {
    const auto& t = kCrc.t;
    for (; n >= 8; n -= 8, p += 8) {
        const uint32_t one = load_le32(p) ^ crc;
        const uint32_t two = load_le32(p + 4);
        crc = t[7][one & 0xFF] ^ t[6][(one >> 8) & 0xFF] ^ t[5][(one >> 16) & 0xFF] ^
              t[4][one >> 24] ^ t[3][two & 0xFF] ^ t[2][(two >> 8) & 0xFF] ^
              t[1][(two >> 16) & 0xFF] ^ t[0][two >> 24];
    }
    for (; n > 0; --n, ++p)
        crc = t[0][(crc ^ *p) & 0xFF] ^ (crc >> 8);
    return crc;
}

#ifdef HX_FILE_HW_CRC
__attribute__((target("sse4.2"))) uint32_t crc_hardware(uint32_t crc, const uint8_t* p,
                                                        std::size_t n) {
    uint64_t wide = crc;
    for (; n >= 8; n -= 8, p += 8) {
        uint64_t word;
        std::memcpy(&word, p, sizeof word);
        wide = _mm_crc32_u64(wide, word);
    }
    crc = static_cast<uint32_t>(wide);
    for (; n > 0; --n, ++p)
        crc = _mm_crc32_u8(crc, *p);
    return crc;
}

bool have_hardware_crc() {
    static const bool yes = __builtin_cpu_supports("sse4.2");
    return yes;
}
#endif

}  // namespace

namespace hx_file_internal {

// --- large buffers ---------------------------------------------------------------
// Buffers that grow with the design go on huge pages where the system offers
// them: page faults and TLB misses are a large part of the cost otherwise.

void* big_alloc(std::size_t bytes) {
    if (bytes < kLarge) return ::operator new(bytes);
    const std::size_t rounded = (bytes + kHugePage - 1) / kHugePage * kHugePage;
    void* p = std::aligned_alloc(kHugePage, rounded);
    if (p == nullptr) throw std::bad_alloc();
#ifdef MADV_HUGEPAGE
    madvise(p, rounded, MADV_HUGEPAGE);
#endif
    return p;
}

void big_free(void* p, std::size_t bytes) {
    if (bytes < kLarge)
        ::operator delete(p);
    else
        std::free(p);
}

ProgressHook progress_hook;

}  // namespace hx_file_internal

void HX_FILE_IO::set_progress(HX_FILE_PROGRESS_FN fn, void* context) {
    progress_hook = ProgressHook{fn, context};
}

uint32_t HX_FILE_IO::checksum(const void* data, std::size_t size, uint32_t crc) {
    const auto* p = static_cast<const uint8_t*>(data);
#ifdef HX_FILE_HW_CRC
    if (have_hardware_crc()) return ~crc_hardware(~crc, p, size);
#endif
    return ~crc_portable(~crc, p, size);
}

uint32_t HX_FILE_IO::checksum_portable(const void* data, std::size_t size, uint32_t crc) {
    return ~crc_portable(~crc, static_cast<const uint8_t*>(data), size);
}
