#include "ut_ptrfile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace {
constexpr std::size_t kBufferSize = 1 << 16;
}

UT_PTRFILE::UT_PTRFILE(int access) : access_(access), stream_(access, kBufferSize) {}

UT_PTRFILE::~UT_PTRFILE() {
    abandon();
}

void UT_PTRFILE::abandon() {
    if (!open_) return;
    open_ = false;
    if (access_ == Port::ACCESS_WRITE) {
        stream_.detach();
        replace_.discard();
    } else {
        Port::File::close(&stream_);
        spool_ = {};
    }
}

bool UT_PTRFILE::open(const char* name) {
    abandon();  // a write in progress is never published by opening another file
    failed_ = false;
    size_ = 0;
    spool_ = {};
    spool_used_ = false;
    spool_read_ = 0;
    name_ = name ? name : "";
    if (name == nullptr || *name == '\0') {
        errno = ENOENT;
        return false;
    }
    if (access_ == Port::ACCESS_WRITE) {
        if (!replace_.create(name)) return false;
        stream_.attach(replace_.fd(), replace_.temp_name().c_str(), false);
    } else if (!open_for_reading(name)) {
        return false;
    }
    open_ = true;
    return true;
}

// "-" is standard input. What is not a regular file (a pipe, a terminal) is
// read in full first, so that it has a size and reads like a file.
bool UT_PTRFILE::open_for_reading(const char* name) {
    const bool standard_input = std::strcmp(name, "-") == 0;
    const int fd = standard_input ? ::fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3)
                                  : ::open(name, O_RDONLY | O_CLOEXEC);
    if (fd < 0) return false;
    struct stat st;
    const bool stat_ok = ::fstat(fd, &st) == 0;
    if (!stat_ok || S_ISDIR(st.st_mode)) {
        const int saved = stat_ok ? EISDIR : errno;
        ::close(fd);
        errno = saved;
        return false;
    }
    if (S_ISREG(st.st_mode)) {
        size_ = static_cast<std::uint64_t>(st.st_size);
        stream_.attach(fd, name, true);
        return true;
    }
    const bool spooled = spool(fd);
    const int saved = errno;
    ::close(fd);
    errno = saved;
    return spooled;
}

bool UT_PTRFILE::spool(int fd) {
    spool_.clear();
    spool_used_ = true;
    std::vector<char> chunk(kBufferSize);
    for (;;) {
        const ssize_t n = ::read(fd, chunk.data(), chunk.size());
        if (n < 0 && errno == EINTR) continue;
        if (n < 0) return false;
        if (n == 0) break;
        spool_.insert(spool_.end(), chunk.data(), chunk.data() + n);
    }
    size_ = spool_.size();
    return true;
}

bool UT_PTRFILE::close() {
    if (!open_) return false;
    open_ = false;
    if (access_ != Port::ACCESS_WRITE) {
        spool_ = {};
        return spool_used_ || Port::File::close(&stream_);
    }
    const bool written = stream_.detach() && !failed_;
    if (written) return replace_.commit();
    replace_.discard();
    return false;
}

std::size_t UT_PTRFILE::read(void* data, std::size_t count) {
    if (!open_) return 0;
    if (!spool_used_) return stream_.read(data, count);
    const std::size_t n = peek(data, count);
    spool_read_ += n;
    return n;
}

std::size_t UT_PTRFILE::peek(void* data, std::size_t count) {
    if (!open_) return 0;
    if (!spool_used_) return stream_.peek(data, count);
    const std::size_t n = std::min(count, spool_.size() - spool_read_);
    std::memcpy(data, spool_.data() + spool_read_, n);
    return n;
}

bool UT_PTRFILE::write(const void* data, std::size_t count) {
    if (!open_ || access_ != Port::ACCESS_WRITE) {
        failed_ = true;
        return false;
    }
    if (!stream_.write(data, count)) return false;
    size_ += count;
    return true;
}
