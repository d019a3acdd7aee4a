#include "port_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>

#include "port_msg.h"
#include "ut_ptrfile.h"

namespace Port {

namespace {

constexpr std::size_t kMinBuffer = 512;
constexpr std::size_t kCopyChunk = 1 << 20;

mode_t new_file_mode() {
    static const mode_t mode = [] {
        const mode_t mask = ::umask(0);
        ::umask(mask);
        return static_cast<mode_t>(0666 & ~mask);
    }();
    return mode;
}

// An existing destination keeps its permissions; a new one gets the default.
mode_t destination_mode(const std::string& target) {
    struct stat st;
    if (::stat(target.c_str(), &st) == 0 && S_ISREG(st.st_mode)) return st.st_mode & 07777;
    return new_file_mode();
}

std::string resolve_destination(const char* destination) {
    char resolved[PATH_MAX];
    struct stat st;
    if (::lstat(destination, &st) == 0 && S_ISLNK(st.st_mode) &&
        ::realpath(destination, resolved) != nullptr) {
        return resolved;
    }
    return destination;
}

void split_path(const std::string& path, std::string& dir, std::string& base) {
    const auto slash = path.find_last_of('/');
    if (slash == std::string::npos) {
        dir = ".";
        base = path;
    } else {
        dir = slash == 0 ? "/" : path.substr(0, slash);
        base = path.substr(slash + 1);
    }
}

const char* temp_directory() {
    const char* dir = std::getenv("TMPDIR");
    struct stat st;
    if (dir != nullptr && *dir != '\0' && ::stat(dir, &st) == 0 && S_ISDIR(st.st_mode)) return dir;
    return "/tmp";
}

int create_exclusive(std::string& name_template) {
    return ::mkstemp(name_template.data());
}

}  // namespace

bool write_all(int fd, const void* bytes, std::size_t count) {
    const char* p = static_cast<const char*>(bytes);
    while (count > 0) {
        const ssize_t n = ::write(fd, p, count);
        if (n < 0) {
            if (errno == EINTR) continue;
            return false;
        }
        if (n == 0) {
            errno = EIO;
            return false;
        }
        p += n;
        count -= static_cast<std::size_t>(n);
    }
    return true;
}

// ---------------------------------------------------------------- Stream

Stream::Stream(int access, std::size_t buffer_size)
    : access_(access), buffer_(buffer_size < kMinBuffer ? kMinBuffer : buffer_size) {}

Stream::~Stream() {
    close_file();
}

void Stream::attach(int fd, const char* name, bool owns) {
    close_file();
    fd_ = fd;
    owns_fd_ = owns;
    error_ = 0;
    name_ = name ? name : "";
    begin_ = end_ = 0;
    update_write_limit();
}

void Stream::update_write_limit() {
    write_limit_ = access_ == ACCESS_WRITE && fd_ >= 0 && error_ == 0 ? buffer_.size() : 0;
}

bool Stream::detach() {
    const bool ok = flush();
    fd_ = -1;
    owns_fd_ = false;
    update_write_limit();
    return ok;
}

bool Stream::open_path(const char* name) {
    close_file();
    if (name == nullptr) return false;
    const int flags =
        access_ == ACCESS_WRITE ? O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC : O_RDONLY | O_CLOEXEC;
    int fd;
    do {
        fd = ::open(name, flags, 0666);
    } while (fd < 0 && errno == EINTR);
    if (fd < 0) return false;
    attach(fd, name, true);
    return true;
}

bool Stream::write_through(const void* bytes, std::size_t count) {
    if (access_ != ACCESS_WRITE || fd_ < 0) {
        if (error_ == 0) error_ = EBADF;
        return false;
    }
    if (error_ != 0) return false;
    if (count > buffer_.size() - end_) {
        if (!flush()) return false;
        if (count >= buffer_.size()) {  // large pieces bypass the buffer
            if (!write_all(fd_, bytes, count)) error_ = errno;
            update_write_limit();
            return error_ == 0;
        }
    }
    std::memcpy(buffer_.data() + end_, bytes, count);
    end_ += count;
    return true;
}

bool Stream::writeline(const char* text) {
    return write(text, text ? std::strlen(text) : 0) && write("\r\n", 2);
}

bool Stream::flush() {
    if (access_ != ACCESS_WRITE) return error_ == 0;
    if (error_ != 0) return false;
    if (end_ > 0 && fd_ >= 0) {
        if (!write_all(fd_, buffer_.data(), end_)) error_ = errno;
        end_ = 0;
    }
    update_write_limit();
    return error_ == 0;
}

bool Stream::fill() {
    begin_ = end_ = 0;
    while (true) {
        const ssize_t n = ::read(fd_, buffer_.data(), buffer_.size());
        if (n < 0 && errno == EINTR) continue;
        if (n < 0) {
            error_ = errno;
            return false;
        }
        end_ = static_cast<std::size_t>(n);
        return n > 0;
    }
}

std::size_t Stream::read(void* bytes, std::size_t count) {
    if (access_ != ACCESS_READ || fd_ < 0) return 0;
    char* out = static_cast<char*>(bytes);
    std::size_t done = 0;
    while (done < count) {
        if (begin_ == end_ && !fill()) break;
        std::size_t n = end_ - begin_;
        if (n > count - done) n = count - done;
        std::memcpy(out + done, buffer_.data() + begin_, n);
        begin_ += n;
        done += n;
    }
    return done;
}

bool Stream::close_file() {
    if (fd_ < 0) return error_ == 0;
    bool ok = flush();
    if (owns_fd_ && ::close(fd_) != 0 && ok) {
        error_ = errno;
        ok = false;
    }
    fd_ = -1;
    owns_fd_ = false;
    update_write_limit();
    return ok;
}

// ---------------------------------------------------------------- ReplaceFile

bool ReplaceFile::create(const char* destination) {
    discard();
    if (destination == nullptr || *destination == '\0') {
        errno = EINVAL;
        return false;
    }
    target_ = resolve_destination(destination);
    std::string dir, base;
    split_path(target_, dir, base);
    temp_ = dir + "/." + base + ".XXXXXX";
    fd_ = create_exclusive(temp_);
    if (fd_ < 0) {
        temp_.clear();
        return false;
    }
    return true;
}

bool ReplaceFile::commit() {
    if (fd_ < 0) return false;
    bool ok = ::fchmod(fd_, destination_mode(target_)) == 0 && ::fsync(fd_) == 0;
    ok = (::close(fd_) == 0) && ok;
    fd_ = -1;
    if (ok && ::rename(temp_.c_str(), target_.c_str()) == 0) {
        temp_.clear();
        return true;
    }
    const int saved = errno;
    discard();
    errno = saved;
    return false;
}

void ReplaceFile::discard() {
    if (fd_ >= 0) ::close(fd_);
    fd_ = -1;
    if (!temp_.empty()) ::unlink(temp_.c_str());
    temp_.clear();
}

// ---------------------------------------------------------------- File

Stream* File::open(const char* name, Stream* stream, bool quiet) {
    if (stream != nullptr && stream->open_path(name)) return stream;
    if (!quiet) {
        const int saved = errno;
        PORT_MSG("Port", "$Revision: 1.0 $")
            .issueError("cannot open file '%s': %s\n", name ? name : "", std::strerror(saved));
    }
    return nullptr;
}

UT_PTRFILE* File::open(const char* name, UT_PTRFILE* file, bool quiet) {
    if (file != nullptr && file->open(name)) return file;
    if (!quiet) {
        const int saved = errno;
        PORT_MSG("Port", "$Revision: 1.0 $")
            .issueError("cannot open file '%s': %s\n", name ? name : "", std::strerror(saved));
    }
    return nullptr;
}

bool File::close(Stream* stream) {
    return stream != nullptr && stream->close_file();
}

bool File::close(UT_PTRFILE* file) {
    return file != nullptr && file->close();
}

namespace {

enum class KernelCopy { done, failed, unsupported };

// Copies in the kernel where it can (no trip through user memory; a clone of
// the extents on file systems that share them). `unsupported` when the
// kernel cannot copy these files at all (another file system, an old
// kernel) before any byte moved, so the caller falls back.
KernelCopy copy_in_kernel(int in, int out) {
    bool moved = false;
    for (;;) {
        const ssize_t n = ::copy_file_range(in, nullptr, out, nullptr, kCopyChunk * 64, 0);
        if (n == 0) return KernelCopy::done;
        if (n > 0) {
            moved = true;
            continue;
        }
        if (errno == EINTR) continue;
        const bool unsupported =
            errno == EXDEV || errno == ENOSYS || errno == EOPNOTSUPP || errno == EINVAL;
        return unsupported && !moved ? KernelCopy::unsupported : KernelCopy::failed;
    }
}

bool copy_through_buffer(int in, int out) {
    std::vector<char> chunk(kCopyChunk);
    for (;;) {
        const ssize_t n = ::read(in, chunk.data(), chunk.size());
        if (n < 0 && errno == EINTR) continue;
        if (n <= 0) return n == 0;
        if (!write_all(out, chunk.data(), static_cast<std::size_t>(n))) return false;
    }
}

}  // namespace

bool File::copy(const char* from, const char* to) {
    if (from == nullptr || to == nullptr) return false;
    const int in = ::open(from, O_RDONLY | O_CLOEXEC);
    if (in < 0) return false;
    ReplaceFile out;
    bool ok = out.create(to);
    if (ok) {
        const KernelCopy copied = copy_in_kernel(in, out.fd());
        ok = copied == KernelCopy::unsupported ? copy_through_buffer(in, out.fd())
                                               : copied == KernelCopy::done;
    }
    ::close(in);
    return ok && out.commit();
}

bool File::remove(const char* name) {
    return name != nullptr && ::unlink(name) == 0;
}

const char* File::tmpnam(char* buffer, std::size_t size) {
    thread_local std::string name;
    std::string fresh = std::string(temp_directory()) + "/vrxXXXXXX";
    const int fd = create_exclusive(fresh);
    if (fd < 0) return nullptr;
    ::close(fd);
    if (buffer == nullptr) {
        name.swap(fresh);
        return name.c_str();
    }
    if (fresh.size() >= size) {
        ::unlink(fresh.c_str());
        return nullptr;
    }
    std::memcpy(buffer, fresh.c_str(), fresh.size() + 1);
    return buffer;
}

}  // namespace Port
