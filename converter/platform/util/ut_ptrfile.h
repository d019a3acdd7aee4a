// A database file object: the netlist database reads from it or writes to it.
//
// Read access (1) reads the named file, or standard input for "-"; a pipe
// or terminal is read in full when opened. Write access (2) never touches the
// destination while writing: bytes go to a temporary file beside it, which a
// clean close renames into place. A close after a failed write, after fail(),
// or destroying the object while still open removes the temporary file and
// leaves the destination as it was, and so does opening another file while a
// write is in progress.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "port_file.h"

class UT_PTRFILE {
  public:
    explicit UT_PTRFILE(int access);
    ~UT_PTRFILE();
    UT_PTRFILE(const UT_PTRFILE&) = delete;
    UT_PTRFILE& operator=(const UT_PTRFILE&) = delete;

    int access() const { return access_; }
    const char* name() const { return name_.c_str(); }
    bool is_open() const { return open_; }

    /// Read access: up to count bytes; fewer only at the end or on an error.
    std::size_t read(void* data, std::size_t count);
    /// Read access: up to count bytes (64 KB at most) that the next read will
    /// return, leaving them unread; fewer only at the end or on an error.
    std::size_t peek(void* data, std::size_t count);
    /// Read access: the file's size when opened. Write access: bytes written so far.
    std::uint64_t size() const { return size_; }

    /// Write access: false once any write has failed.
    bool write(const void* data, std::size_t count);
    /// Marks the write as failed, so that close will not publish the file.
    void fail() { failed_ = true; }
    bool failed() const { return failed_ || stream_.failed(); }
    /// The errno of the first failed write or read, 0 when none.
    int error() const { return stream_.error(); }

  private:
    friend class Port::File;
    bool open(const char* name);
    bool close();
    void abandon();
    bool open_for_reading(const char* name);
    bool spool(int fd);

    int access_;
    bool open_ = false;
    bool failed_ = false;
    std::uint64_t size_ = 0;
    std::string name_;
    Port::Stream stream_;
    Port::ReplaceFile replace_;
    std::vector<char> spool_;  // what a pipe or terminal gave, read in full
    bool spool_used_ = false;
    std::size_t spool_read_ = 0;
};
