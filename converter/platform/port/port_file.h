// Files and streams of the portability library.
//
// Port::Stream is a buffered byte stream on a file. A failed write is
// remembered: the stream stops writing and Port::File::close reports false, so
// that the caller can refuse to publish a damaged file.
//
// Port::File gathers the file operations. copy() replaces its destination
// through ReplaceFile, tmpnam() creates a fresh file exclusively so no other
// process can take the name. A new file gets the usual 0666 less the umask.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <optional>
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
    /// Copies up to count bytes (at most the buffer's size) that the next read
    /// will return, without consuming them; fewer only at the end or on an error.
    std::size_t peek(void* bytes, std::size_t count);
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
    /// Bytes handed to the system so far (buffered ones not counted).
    std::uint64_t bytes_written() const { return bytes_written_; }

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
    void fill_ahead(std::size_t count);

    int access_;
    int fd_ = -1;
    bool owns_fd_ = false;
    int error_ = 0;
    std::string name_;
    std::vector<char> buffer_;
    std::size_t begin_ = 0;  // read: first unread byte
    std::size_t end_ = 0;    // read: end of valid bytes; write: bytes pending
    std::size_t write_limit_ = 0;
    std::uint64_t bytes_written_ = 0;
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

/// The one way this library writes a destination so that it is whole or
/// untouched. A path that is absent or names a regular file gets a temporary
/// file beside it (unnamed where the file system allows, so that not even
/// SIGKILL leaves it behind), which commit() puts in place; discard() or the
/// destructor drops it. A symbolic link is followed: its target is replaced
/// (or, dangling, created) and the link stays. A device, FIFO, socket or
/// terminal, a descriptor reached through /proc or /dev/fd, and "-" (standard
/// output) are written in place, never replaced. A replaced file keeps the
/// owner and mode it had where the process may set them; other hard links to
/// it keep the former contents, as with any rename.
class ReplaceFile {
  public:
    ReplaceFile() = default;
    ~ReplaceFile() { discard(); }
    ReplaceFile(const ReplaceFile&) = delete;
    ReplaceFile& operator=(const ReplaceFile&) = delete;

    /// False with errno set when nothing could be opened.
    bool create(const char* destination);
    int fd() const { return fd_; }
    /// The name to show for the file being written: the temporary file's, or
    /// the destination's when the temporary file has none or the destination
    /// is written in place.
    const std::string& temp_name() const { return shown_; }
    bool in_place() const { return in_place_; }
    /// Syncs, gives the file the destination's owner and mode and puts it in
    /// place. On failure the temporary file is removed and false returned
    /// with errno set.
    bool commit();
    void discard();

  private:
    bool open_in_place(const char* path, int flags);
    bool open_unnamed(const std::string& dir);
    bool open_named(const std::string& dir, const std::string& base);
    bool link_unnamed();
    void forget_temp();

    int fd_ = -1;
    bool in_place_ = false;
    bool unnamed_ = false;
    int slot_ = -1;  // where the signal and exit cleanup knows the temporary name
    std::string temp_;
    std::string target_;
    std::string shown_;
};

/// Device and inode of a file.
struct FileId {
    dev_t device = 0;
    ino_t inode = 0;
    bool operator==(const FileId&) const = default;
};

/// The identity of the regular file that path names (links followed; "-" is
/// standard input when `input` is set, else standard output). Nothing for
/// other kinds of file and for absent ones.
std::optional<FileId> regular_file_id(const char* path, bool input);

/// For programs: SIGINT, SIGTERM and SIGHUP remove the temporary files of
/// writes in progress and then end the process by the same signal (status
/// 128 + signal to a shell); SIGXFSZ is ignored, so that a size limit makes a
/// write fail with EFBIG instead of killing the process. A normal exit,
/// including one through a fatal report, removes them in any case.
void guard_temporary_files();

/// write(2) until every byte is out; false on an error (errno set).
bool write_all(int fd, const void* bytes, std::size_t count);

}  // namespace Port
