// Feeds the text writer every design and library that the database file
// reader accepts from arbitrary bytes (as they are, and with a header made
// to match them, as in hx_file_fuzz). Writing must never crash or touch
// memory it should not, whatever the names, properties and structure; fatal
// reports (values the text cannot carry) come back to the writer, which must
// carry on safely. The text goes to /dev/null.
#include <fcntl.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <string>

#include "hx_file.h"
#include "hx_library.h"
#include "port_file.h"
#include "port_msg.h"
#include "sealed_file.h"
#include "vrx.h"

struct VRX_TEST_ACCESS {
    static void write(VRX& vrx, HX_LIBRARY& library, HX_FILE_TYPE kind) {
        Port::Stream stream(Port::ACCESS_WRITE, 4096);
        const int fd = ::open("/dev/null", O_WRONLY | O_CLOEXEC);
        if (fd < 0) __builtin_trap();
        stream.attach(fd, "/dev/null", true);
        vrx.out_stream = &stream;
        if (kind == HX_FILE_DESIGN) {
            auto* links = library.create_liblink_iter();
            vrx.design = links->l_next()->get_design();
            library.delete_liblink_iter(links);
            vrx.write_design();
        } else {
            vrx.library = &library;
            vrx.write_library();
        }
        vrx.out_stream = nullptr;
    }
};

namespace {

void quiet_and_alive() {
    static const bool done = [] {
        Port_MsgDispatcher::set_sink(
            [](Port_MsgLevel, const Port_MsgLocation&, std::string_view) {});
        Port_MsgDispatcher::set_exit_handler([](int) {});
        return true;
    }();
    (void)done;
}

void decode_and_write(const void* data, size_t size) {
    HX_FILE_TYPE kind = HX_FILE_IO::kind_of(data, size);
    if (kind == HX_FILE_UNKNOWN) kind = HX_FILE_DESIGN;
    std::string reason;
    auto library = HX_FILE_IO::decode(data, size, kind, reason);
    if (library == nullptr) return;
    VRX vrx;
    VRX_TEST_ACCESS::write(vrx, *library, kind);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    quiet_and_alive();
    read_raw_and_sealed(data, size, decode_and_write);
    return 0;
}
