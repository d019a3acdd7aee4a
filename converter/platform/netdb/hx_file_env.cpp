// The environment's file operations: database files read whole, and written.
#include "hx_file.h"

#include <cstring>
#include <memory>
#include <string>

#include "hx_design.h"
#include "hx_file_internal.h"
#include "hx_library.h"
#include "hx_prim_layout.h"
#include "hx_storage.h"
#include "port_file.h"
#include "port_msg.h"
#include "ut_ptrfile.h"

using namespace hx_file_internal;

// --- files -----------------------------------------------------------------------
//
// A file is read once, whole, into memory. get_file_type only looks at its
// first bytes, which the file object keeps for the read that follows.

namespace {

bool readable(const UT_PTRFILE* file) {
    return file != nullptr && file->is_open() && file->access() == Port::ACCESS_READ;
}

/// The whole file, in bytes from big_alloc.
class BigBytes {
  public:
    BigBytes() = default;
    BigBytes(const BigBytes&) = delete;
    BigBytes& operator=(const BigBytes&) = delete;
    ~BigBytes() {
        if (data_ != nullptr) big_free(data_, size_);
    }
    void reset(std::size_t size) {
        auto* fresh = static_cast<uint8_t*>(big_alloc(size));
        if (data_ != nullptr) big_free(data_, size_);
        data_ = fresh;
        size_ = size;
    }
    uint8_t* get() const { return data_; }

  private:
    uint8_t* data_ = nullptr;
    std::size_t size_ = 0;
};

bool read_all(UT_PTRFILE* file, BigBytes& buffer, const uint8_t*& data, std::size_t& size) {
    size = static_cast<std::size_t>(file->size());
    buffer.reset(size);
    data = buffer.get();
    return file->read(buffer.get(), size) == size;
}

}  // namespace

HX_FILE_TYPE HX_FILE_IO::peek_type(UT_PTRFILE* file) {
    if (!readable(file)) return HX_FILE_UNKNOWN;
    uint8_t magic[kMagicSize];
    return kind_of(magic, file->peek(magic, kMagicSize));
}

std::unique_ptr<HX_LIBRARY> HX_FILE_IO::read(UT_PTRFILE* file, HX_FILE_TYPE expected, bool quiet) {
    std::string reason;
    std::unique_ptr<HX_LIBRARY> library;
    if (!readable(file)) {
        reason = "not open for reading";
    } else {
        // Running out of memory is not the file's fault: std::bad_alloc goes
        // on to the caller, as everywhere in the database.
        BigBytes buffer;
        const uint8_t* data = nullptr;
        std::size_t size = 0;
        if (read_all(file, buffer, data, size)) {
            library = decode(data, size, expected, reason);
        } else {
            reason = "could not be read completely";
        }
    }
    if (library == nullptr && !quiet) {
        PORT_MSG("HX", kRevision)
            .issueError("cannot read database file '%s': %s\n", file ? file->name() : "",
                        reason.c_str());
    }
    return library;
}

// --- the environment's file operations ----------------------------------------

namespace {

bool report_write(UT_PTRFILE* file, bool written) {
    if (!written) {
        const int error = file != nullptr ? file->error() : 0;
        PORT_MSG("HX", kRevision)
            .issueError("cannot write database file '%s'%s%s\n", file ? file->name() : "",
                        error != 0 ? ": " : "", error != 0 ? std::strerror(error) : "");
    }
    return written;
}

}  // namespace

HX_FILE_TYPE HX_ENVIRONMENT::get_file_type(UT_PTRFILE* file) {
    return HX_FILE_IO::peek_type(file);
}

HX_DESIGN* HX_ENVIRONMENT::create_design(UT_PTRFILE* file, uint8_t quiet) {
    std::unique_ptr<HX_LIBRARY> library = HX_FILE_IO::read(file, HX_FILE_DESIGN, quiet != 0);
    if (library == nullptr) return nullptr;
    auto* links = library->create_liblink_iter();
    HX_DESIGN* design = links->l_next()->get_design();
    library->delete_liblink_iter(links);
    adopt(std::move(library));
    return design;
}

HX_LIBRARY* HX_ENVIRONMENT::create_library(UT_PTRFILE* file) {
    std::unique_ptr<HX_LIBRARY> library = HX_FILE_IO::read(file, HX_FILE_LIBRARY, false);
    return library ? adopt(std::move(library)) : nullptr;
}

bool HX_ENVIRONMENT::write_design(UT_PTRFILE* file, HX_DESIGN* design) {
    if (design == nullptr) {
        if (file != nullptr) file->fail();
        return report_write(file, false);
    }
    return report_write(file, HX_FILE_IO::write(file, *design));
}

bool HX_ENVIRONMENT::write_library(UT_PTRFILE* file, HX_LIBRARY* library) {
    if (library == nullptr) {
        if (file != nullptr) file->fail();
        return report_write(file, false);
    }
    return report_write(file, HX_FILE_IO::write(file, *library));
}
