// Binary design (.hxb) and library (.hxl) files. Private to the database.
//
// All integers are little-endian and fixed-width. A file is a 32-byte header
// followed by the body:
//
//   header   magic[8]     "\x89HXDSGN\n" (design) or "\x89HXLIBR\n" (library)
//            u32 checksum CRC-32C of every byte after this field (offset 12 on)
//            u32 version  format version (kFormatVersion)
//            u64 body     byte count of the body
//            u64 reserved 0
//
// The header's layout is the same in every version, so that a newer file is
// recognised as such. The body of a design file is one design record; that
// of a library file is
//
//   library  string name, u8 case sense, u8 flags, u32 design count,
//            design records, u32 alias count, (string alias, u32 design)*
//
// followed in both kinds by the property section. The records:
//
//   string   u32 length (0xFFFFFFFF: absent name), the bytes, a 0 byte
//   design   string name, u8 flags, u32 last tag handed out,
//            u32 count, blocks; u32 count, signals; u32 count, networks;
//            u32 count, map signals; u32 count, physical parent lists
//   block    u8 kind flags, u8 user flag, u8 primitive type, u8 flags,
//            u16 width (primitive) or pin count (plain block),
//            u32 parent (index + 1; 0: a root), string name, then one pin
//            record per pin
//   pin      u8 flags, u8 direction, u8 map inversion, u8 inversion,
//            string name when flag NAMED is set (else the pin keeps the
//            name it was made with: none, or the primitive's pin name)
//   signal   u32 owner (block index + 1; 0: a global signal), u8 flags,
//            string name, u32 count, connections (u32 block, u16 pin); the
//            top bit of the block marks a global signal on a pin's inner
//            side (merge_signals puts it there)
//   network  u32 tag, u32 highest signal, u8 flags
//   map sig. u32 physical block, u16 pin, u8 flags, string name,
//            u32 count, further connections (u32 logical block, u16 pin)
//   parents  u32 physical block, u32 count, u32 logical block*
//
// Blocks, a block's signals, the global signals, networks and map signals
// are listed in the database's own orders and numbered from 0 in file order
// (signals: globals first, then each block's). The network a signal belongs
// to follows from the connections; network records give each network, named
// by its highest signal, its tag and its place in the design's order.
//
// Records whose flag PROPS is set own properties. The property section lists
// them in file order (the library, then per design: the design, each block
// followed by its pins, signals, networks, map signals), each as
//
//   u32 count, (string name, u8 kind, value)*
//
// with values: flag none; integer u32; float u64 (IEEE bits); string,
// parameter and timing string a string; timing u32 min, u32 max, u32 unit;
// pin reference the same followed by u16 pin, u32 edge, u8 inverted; object
// u8 kind (0 none, 1 library, 2 design, 3 block, 4 pin, 5 signal,
// 6 network, 7 map signal), u32 design, u32 index, u16 pin. An object that
// is not part of the file (another library, say) is written as none.
//
// Reading checks the header, then the checksum over the whole content, and
// only then builds, through the database's own operations, into objects that
// belong to the reader until everything has been read. Every count is
// checked against the bytes left before anything is allocated, so memory
// stays within a small multiple of the file's size.
//
// A progress callback, when installed, hears how far a read or write has
// come, in bytes of the file: a read reports the bytes decoded once the file
// is in memory, a write the bytes handed to the file once they are encoded.
// Reports come per chunk (thousands of records, or megabytes), never per
// record, and `done` never decreases within one read or write.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "hx_types.h"

class HX_DESIGN;
class HX_LIBRARY;
class UT_PTRFILE;

/// `done` of `total` bytes of the file being read or written.
using HX_FILE_PROGRESS_FN = void (*)(void* context, uint64_t done, uint64_t total);

class HX_FILE_IO {
  public:
    static constexpr uint32_t kFormatVersion = 1;
    static constexpr std::size_t kHeaderSize = 32;

    /// CRC-32C (Castagnoli polynomial) of `size` bytes, continuing `crc`.
    static uint32_t checksum(const void* data, std::size_t size, uint32_t crc = 0);
    /// The same without the processor's CRC instructions.
    static uint32_t checksum_portable(const void* data, std::size_t size, uint32_t crc = 0);

    /// The whole file for a design or a library.
    static std::string encode(const HX_DESIGN& design);
    static std::string encode(const HX_LIBRARY& library);

    /// Reads file bytes of the kind `expected`. A design comes in a library
    /// of its own, named after it. Null on refusal, with `reason` set to a
    /// text such as "corrupt (checksum mismatch)".
    static std::unique_ptr<HX_LIBRARY> decode(const void* data, std::size_t size,
                                              HX_FILE_TYPE expected, std::string& reason);

    /// The kind that the first bytes of a file announce.
    static HX_FILE_TYPE kind_of(const void* data, std::size_t size);

    // The environment's file operations (see HX_ENVIRONMENT).
    static HX_FILE_TYPE peek_type(UT_PTRFILE* file);
    static std::unique_ptr<HX_LIBRARY> read(UT_PTRFILE* file, HX_FILE_TYPE expected, bool quiet);
    static bool write(UT_PTRFILE* file, const HX_DESIGN& design);
    static bool write(UT_PTRFILE* file, const HX_LIBRARY& library);

    /// Installs the process-wide progress callback, heard by decode (and so
    /// read) and write; a null `fn` removes it.
    static void set_progress(HX_FILE_PROGRESS_FN fn, void* context);

  private:
    class ConnBatch;
    class Encoder;
    class Decoder;

    static bool writable(const UT_PTRFILE* file);
    static bool write(UT_PTRFILE* file, Encoder& encoder);
    static bool refuse(UT_PTRFILE* file, const std::string& why);
};
