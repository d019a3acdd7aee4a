#include "ut_ptrfile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

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
    }
}

bool UT_PTRFILE::open(const char* name) {
    abandon();  // a write in progress is never published by opening another file
    failed_ = false;
    size_ = 0;
    name_ = name ? name : "";
    if (name == nullptr || *name == '\0') {
        errno = ENOENT;
        return false;
    }
    if (access_ == Port::ACCESS_WRITE) {
        if (!replace_.create(name)) return false;
        stream_.attach(replace_.fd(), replace_.temp_name().c_str(), false);
    } else {
        const int fd = ::open(name, O_RDONLY | O_CLOEXEC);
        if (fd < 0) return false;
        struct stat st;
        const bool stat_ok = ::fstat(fd, &st) == 0;
        if (!stat_ok || S_ISDIR(st.st_mode)) {
            const int saved = stat_ok ? EISDIR : errno;
            ::close(fd);
            errno = saved;
            return false;
        }
        size_ = static_cast<std::uint64_t>(st.st_size);
        stream_.attach(fd, name, true);
    }
    open_ = true;
    return true;
}

bool UT_PTRFILE::close() {
    if (!open_) return false;
    open_ = false;
    if (access_ != Port::ACCESS_WRITE) return Port::File::close(&stream_);
    const bool written = stream_.detach() && !failed_;
    if (written) return replace_.commit();
    replace_.discard();
    return false;
}

std::size_t UT_PTRFILE::read(void* data, std::size_t count) {
    return open_ ? stream_.read(data, count) : 0;
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
