#include "port_file.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <ctime>

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

// A replaced file keeps its owner and mode where the process may set them;
// set-id bits are not carried to a file that another owner would not have.
bool keep_owner_and_mode(int fd, const std::string& target) {
    struct stat st;
    if (::stat(target.c_str(), &st) != 0 || !S_ISREG(st.st_mode))
        return ::fchmod(fd, new_file_mode()) == 0;
    mode_t mode = st.st_mode & 07777;
    if ((st.st_uid != ::geteuid() || st.st_gid != ::getegid()) &&
        ::fchown(fd, st.st_uid, st.st_gid) != 0) {
        if (::fchown(fd, static_cast<uid_t>(-1), st.st_gid) != 0) mode &= ~S_ISGID;
        mode &= ~S_ISUID;
    }
    return ::fchmod(fd, mode) == 0;
}

// Links under /proc and /dev/fd name open descriptors (a pipe, a terminal, a
// file opened by the shell), not paths that can be replaced.
bool names_descriptor(const std::string& path) {
    return path.starts_with("/proc/") || path.starts_with("/dev/fd/");
}

// Follows symbolic links by hand, so that a dangling one yields the path it
// names. `descriptor` tells that the chain passed through a descriptor link.
bool follow_links(const char* destination, std::string& target, bool& descriptor) {
    target = destination;
    descriptor = names_descriptor(target);
    for (int hops = 0; hops < 40; ++hops) {
        struct stat st;
        if (::lstat(target.c_str(), &st) != 0 || !S_ISLNK(st.st_mode)) return true;
        std::string link(PATH_MAX, '\0');
        const ssize_t n = ::readlink(target.c_str(), link.data(), link.size());
        if (n < 0) return false;
        link.resize(static_cast<std::size_t>(n));
        if (!link.starts_with('/')) {
            const auto slash = target.find_last_of('/');
            if (slash != std::string::npos) link = target.substr(0, slash + 1) + link;
        }
        target = link;
        descriptor = descriptor || names_descriptor(target);
    }
    errno = ELOOP;
    return false;
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

// A hidden name beside the destination; a short one when the destination's
// own name leaves no room for the suffix.
std::string temp_template(const std::string& dir, const std::string& base) {
    constexpr std::size_t kNameMax = 255;
    const std::string stem = base.size() + 8 <= kNameMax ? base : std::string("vrx");
    return dir + "/." + stem + ".XXXXXX";
}

// Replaces the trailing XXXXXX with letters that differ between calls and processes.
void fill_template(std::string& name) {
    static unsigned long counter = 0;
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    unsigned long long v = static_cast<unsigned long long>(now.tv_nsec) ^
                           (static_cast<unsigned long long>(::getpid()) << 20) ^ (++counter * 7919);
    for (std::size_t i = name.size() - 6; i < name.size(); ++i, v /= 36)
        name[i] = "abcdefghijklmnopqrstuvwxyz0123456789"[v % 36];
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

// Names of temporary files that exist now, removed on a signal or at exit.
// Fixed storage that the signal handler only reads.
struct TempSlot {
    volatile std::sig_atomic_t used;
    char path[PATH_MAX];
};
constexpr int kTempSlots = 16;
TempSlot temp_slots[kTempSlots];

void remove_temporaries() {
    for (TempSlot& slot : temp_slots) {
        if (slot.used) ::unlink(slot.path);
    }
}

int register_temp(const std::string& path) {
    static const bool hooked = std::atexit(remove_temporaries) == 0;
    (void)hooked;
    if (path.size() >= PATH_MAX) return -1;
    for (int i = 0; i < kTempSlots; ++i) {
        if (temp_slots[i].used) continue;
        std::memcpy(temp_slots[i].path, path.c_str(), path.size() + 1);
        temp_slots[i].used = 1;
        return i;
    }
    return -1;
}

void unregister_temp(int slot) {
    if (slot >= 0) temp_slots[slot].used = 0;
}

extern "C" void remove_temporaries_and_die(int signal_number) {
    remove_temporaries();
    ::signal(signal_number, SIG_DFL);
    ::raise(signal_number);  // delivered when the handler returns
}

// A Unix-domain socket is written by connecting to it.
int connect_socket(const char* path) {
    sockaddr_un address{};
    if (std::strlen(path) >= sizeof address.sun_path) {
        errno = ENAMETOOLONG;
        return -1;
    }
    address.sun_family = AF_UNIX;
    std::strcpy(address.sun_path, path);
    const int fd = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0) return -1;
    if (::connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0) return fd;
    const int saved = errno;
    ::close(fd);
    errno = saved;
    return -1;
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
    bytes_written_ = 0;
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
            if (error_ == 0) bytes_written_ += count;
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
        if (error_ == 0) bytes_written_ += end_;
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

std::size_t Stream::peek(void* bytes, std::size_t count) {
    if (access_ != ACCESS_READ || fd_ < 0) return 0;
    count = std::min(count, buffer_.size());
    if (end_ - begin_ < count) fill_ahead(count);
    const std::size_t n = std::min(count, end_ - begin_);
    std::memcpy(bytes, buffer_.data() + begin_, n);
    return n;
}

// Moves the unread bytes to the front and reads until `count` are there.
void Stream::fill_ahead(std::size_t count) {
    std::memmove(buffer_.data(), buffer_.data() + begin_, end_ - begin_);
    end_ -= begin_;
    begin_ = 0;
    while (end_ < count) {
        const ssize_t n = ::read(fd_, buffer_.data() + end_, buffer_.size() - end_);
        if (n < 0 && errno == EINTR) continue;
        if (n < 0) error_ = errno;
        if (n <= 0) return;
        end_ += static_cast<std::size_t>(n);
    }
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
    if (std::strcmp(destination, "-") == 0) {
        shown_ = destination;
        fd_ = ::fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, 3);
        in_place_ = fd_ >= 0;
        return in_place_;
    }
    bool descriptor = false;
    if (!follow_links(destination, target_, descriptor)) return false;
    struct stat st;
    const char* probe = descriptor ? destination : target_.c_str();
    if (::stat(probe, &st) == 0) {
        if (S_ISDIR(st.st_mode)) {
            errno = EISDIR;
            return false;
        }
        if (descriptor || !S_ISREG(st.st_mode))
            return open_in_place(destination, S_ISREG(st.st_mode) ? O_TRUNC : 0);
    } else if (errno != ENOENT || descriptor) {
        return false;
    }
    std::string dir, base;
    split_path(target_, dir, base);
    return open_unnamed(dir) || open_named(dir, base);
}

// Devices, FIFOs, sockets and terminals are written through, never replaced.
bool ReplaceFile::open_in_place(const char* path, int flags) {
    struct stat st;
    if (::stat(path, &st) == 0 && S_ISSOCK(st.st_mode)) {
        fd_ = connect_socket(path);
    } else {
        do {
            fd_ = ::open(path, O_WRONLY | O_NOCTTY | O_CLOEXEC | flags);
        } while (fd_ < 0 && errno == EINTR);
    }
    if (fd_ < 0) return false;
    in_place_ = true;
    shown_ = path;
    return true;
}

// Linking an unnamed file into place needs its /proc entry.
bool ReplaceFile::open_unnamed(const std::string& dir) {
    if (::access("/proc/self/fd", X_OK) != 0) return false;
    fd_ = ::open(dir.c_str(), O_TMPFILE | O_WRONLY | O_CLOEXEC, 0600);
    if (fd_ < 0) return false;
    unnamed_ = true;
    shown_ = target_;
    return true;
}

bool ReplaceFile::open_named(const std::string& dir, const std::string& base) {
    temp_ = temp_template(dir, base);
    fd_ = create_exclusive(temp_);
    if (fd_ < 0) {
        temp_.clear();
        return false;
    }
    slot_ = register_temp(temp_);
    shown_ = temp_;
    return true;
}

// An absent destination is linked directly; an existing one is replaced by
// linking under a temporary name and renaming that over it.
bool ReplaceFile::link_unnamed() {
    const std::string self = "/proc/self/fd/" + std::to_string(fd_);
    if (::linkat(AT_FDCWD, self.c_str(), AT_FDCWD, target_.c_str(), AT_SYMLINK_FOLLOW) == 0)
        return true;
    if (errno != EEXIST) return false;
    std::string dir, base;
    split_path(target_, dir, base);
    for (int attempt = 0; attempt < 100; ++attempt) {
        temp_ = temp_template(dir, base);
        fill_template(temp_);
        slot_ = register_temp(temp_);
        if (::linkat(AT_FDCWD, self.c_str(), AT_FDCWD, temp_.c_str(), AT_SYMLINK_FOLLOW) == 0)
            return ::rename(temp_.c_str(), target_.c_str()) == 0;
        const int saved = errno;
        forget_temp();
        errno = saved;
        if (errno != EEXIST) return false;
    }
    return false;
}

bool ReplaceFile::commit() {
    if (fd_ < 0) return false;
    if (in_place_) {
        const bool closed = ::close(fd_) == 0;
        fd_ = -1;
        const int saved = errno;
        discard();
        errno = saved;
        return closed;
    }
    bool ok = keep_owner_and_mode(fd_, target_) && ::fsync(fd_) == 0;
    if (unnamed_) {
        ok = ok && link_unnamed();
        ok = (::close(fd_) == 0) && ok;
    } else {
        ok = (::close(fd_) == 0) && ok;
        ok = ok && ::rename(temp_.c_str(), target_.c_str()) == 0;
    }
    fd_ = -1;
    if (ok) forget_temp();  // the name now belongs to the destination
    const int saved = errno;
    discard();
    errno = saved;
    return ok;
}

void ReplaceFile::forget_temp() {
    unregister_temp(slot_);
    slot_ = -1;
    temp_.clear();
}

void ReplaceFile::discard() {
    if (fd_ >= 0) ::close(fd_);
    fd_ = -1;
    if (!temp_.empty()) ::unlink(temp_.c_str());
    forget_temp();
    in_place_ = false;
    unnamed_ = false;
    target_.clear();
    shown_.clear();
}

std::optional<FileId> regular_file_id(const char* path, bool input) {
    if (path == nullptr) return std::nullopt;
    struct stat st;
    const int got = std::strcmp(path, "-") == 0 ? ::fstat(input ? STDIN_FILENO : STDOUT_FILENO, &st)
                                                : ::stat(path, &st);
    if (got != 0 || !S_ISREG(st.st_mode)) return std::nullopt;
    return FileId{st.st_dev, st.st_ino};
}

void guard_temporary_files() {
    struct sigaction action {};
    action.sa_handler = remove_temporaries_and_die;
    sigemptyset(&action.sa_mask);
    for (const int signal_number : {SIGINT, SIGTERM, SIGHUP}) {
        struct sigaction former {};
        // A signal ignored by whoever started the process (nohup) stays ignored.
        if (::sigaction(signal_number, nullptr, &former) == 0 && former.sa_handler == SIG_IGN)
            continue;
        ::sigaction(signal_number, &action, nullptr);
    }
    ::signal(SIGXFSZ, SIG_IGN);
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
