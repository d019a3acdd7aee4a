// Files and streams of the portability library.
//
// Port::Stream is a buffered byte stream on a file. A failed write is
// remembered: the stream stops writing and Port::File::close reports false, so
// that the caller can refuse to publish a damaged file.
//
// Port::File gathers the file operations. copy() replaces its destination
// atomically (temporary file in the destination's directory, renamed over it),
// tmpnam() creates a fresh file exclusively so no other process can take the
// name. Both keep an existing destination's permissions; a new file gets the
// usual 0666 less the umask.
#pragma once

#include <cstddef>
#include <cstring>
#include <string>
#include <vector>

class UT_PTRFILE;

namespace Port {

enum Access : int { ACCESS_READ = 1, ACCESS_WRITE = 2 };

class Stream {
  public:
    Stream(int access, std::size_t buffer_size);
    ~Stream();  ///< closes a file still open, without reporting
    Stream(const Stream&) = delete;
    Stream& operator=(const Stream&) = delete;

    /// Writes exactly count bytes (buffered). False once any write has failed.
    /// Pieces that fit the buffer are copied in place; the rest goes out of line.
    bool write(const void* bytes, std::size_t count) {
        // write_limit_ is the buffer's size while writing is possible, else 0.
        if (end_ <= write_limit_ && count <= write_limit_ - end_) {
            copy_bytes(buffer_.data() + end_, static_cast<const char*>(bytes), count);
            end_ += count;
            return true;
        }
        return write_through(bytes, count);
    }
    /// Writes the text followed by the line end "\r\n".
    bool writeline(const char* text);
    /// Reads up to count bytes; fewer only at the end of the file or on an error.
    std::size_t read(void* bytes, std::size_t count);
    /// Hands buffered bytes to the system. False once any write has failed.
    bool flush();

    /// Takes an open descriptor; with owns set, closing the stream closes it.
    void attach(int fd, const char* name, bool owns);
    /// Flushes and lets go of the descriptor without closing it.
    bool detach();

    bool is_open() const { return fd_ >= 0; }
    bool failed() const { return error_ != 0; }
    /// The errno of the first failure, 0 when none.
    int error() const { return error_; }
    int access() const { return access_; }
    const char* name() const { return name_.c_str(); }

  private:
    friend class File;
    // Writers hand over many short pieces; copying those with fixed-size
    // moves saves a library call each. Only bytes of [from, from + count)
    // are read and only [to, to + count) written.
    static void copy_bytes(char* to, const char* from, std::size_t count) {
        if (count > 16)
            std::memcpy(to, from, count);
        else if (count >= 8)
            copy_ends<8>(to, from, count);
        else if (count >= 4)
            copy_ends<4>(to, from, count);
        else if (count > 0) {
            to[0] = from[0];
            to[count / 2] = from[count / 2];
            to[count - 1] = from[count - 1];
        }
    }
    // The first and the last N bytes (overlapping), for N <= count <= 2 N.
    template <std::size_t N>
    static void copy_ends(char* to, const char* from, std::size_t count) {
        char head[N], tail[N];
        std::memcpy(head, from, N);
        std::memcpy(tail, from + count - N, N);
        std::memcpy(to, head, N);
        std::memcpy(to + count - N, tail, N);
    }
    bool write_through(const void* bytes, std::size_t count);
    void update_write_limit();
    bool open_path(const char* name);
    bool close_file();
    bool fill();

    int access_;
    int fd_ = -1;
    bool owns_fd_ = false;
    int error_ = 0;
    std::string name_;
    std::vector<char> buffer_;
    std::size_t begin_ = 0;  // read: first unread byte
    std::size_t end_ = 0;    // read: end of valid bytes; write: bytes pending
    std::size_t write_limit_ = 0;
};

class File {
  public:
    /// Opens name into the stream (reading or writing per its access; writing
    /// creates or truncates). Returns the stream, or null on failure. Unless
    /// quiet is set, a failure is also reported at error level.
    static Stream* open(const char* name, Stream* stream, bool quiet);
    /// Opens name into the database file object (see UT_PTRFILE).
    static UT_PTRFILE* open(const char* name, UT_PTRFILE* file, bool quiet);
    /// Flushes and closes; false when any write or the close failed.
    static bool close(Stream* stream);
    /// Closes; for write access publishes the file only after an error-free write.
    static bool close(UT_PTRFILE* file);
    /// Replaces `to` atomically with a copy of `from`; `to` is left untouched on failure.
    static bool copy(const char* from, const char* to);
    static bool remove(const char* name);
    /// Creates a new empty file in $TMPDIR (or /tmp when that is unset or unusable)
    /// and returns its name: in buffer when one is given (null when it is too small,
    /// and the file is then removed again), else in a library-owned text valid until
    /// the next call on the same thread. Null when no file could be created.
    static const char* tmpnam(char* buffer = nullptr, std::size_t size = 0);
};

/// A temporary file beside a destination, renamed over it by commit() and
/// removed by discard() or the destructor. A destination that is a symbolic
/// link is resolved, so the link stays and its target is replaced.
class ReplaceFile {
  public:
    ReplaceFile() = default;
    ~ReplaceFile() { discard(); }
    ReplaceFile(const ReplaceFile&) = delete;
    ReplaceFile& operator=(const ReplaceFile&) = delete;

    bool create(const char* destination);
    int fd() const { return fd_; }
    const std::string& temp_name() const { return temp_; }
    /// Syncs, gives the file the destination's permissions and renames it into
    /// place. On failure the temporary file is removed and false returned.
    bool commit();
    void discard();

  private:
    int fd_ = -1;
    std::string temp_;
    std::string target_;
};

/// write(2) until every byte is out; false on an error (errno set).
bool write_all(int fd, const void* bytes, std::size_t count);

}  // namespace Port
