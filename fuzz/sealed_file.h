// For the targets that feed the database file reader: the bytes with the
// header's length and checksum fields made to fit, so that mutations reach
// the content decoder rather than stopping at the checksum.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "hx_file.h"

/// Needs at least HX_FILE_IO::kHeaderSize bytes.
inline std::string sealed_file(const uint8_t* data, size_t size) {
    std::string bytes(reinterpret_cast<const char*>(data), size);
    const uint64_t body = size - HX_FILE_IO::kHeaderSize;
    for (int i = 0; i < 8; ++i)
        bytes[16 + i] = static_cast<char>(body >> (8 * i));
    const uint32_t crc = HX_FILE_IO::checksum(bytes.data() + 12, size - 12);
    for (int i = 0; i < 4; ++i)
        bytes[8 + i] = static_cast<char>(crc >> (8 * i));
    return bytes;
}

/// Hands the bytes to `read` as they are, then sealed when they hold a header.
template <class Read>
void read_raw_and_sealed(const uint8_t* data, size_t size, Read&& read) {
    read(data, size);
    if (size >= HX_FILE_IO::kHeaderSize) {
        const std::string bytes = sealed_file(data, size);
        read(bytes.data(), bytes.size());
    }
}
