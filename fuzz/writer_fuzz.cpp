// Feeds the text writer every design and library that the database file
// reader accepts from arbitrary bytes (as they are, and with a header made
// to match them, as in hx_file_fuzz). Writing must never crash or touch
// memory it should not, whatever the names, properties and structure; fatal
// reports (values the text cannot carry) come back to the writer, which must
// carry on safely. Text written without a warning, an error or a fatal
// report must read back without a parse error. At exit the run tells how
// many inputs the decoder accepted and how many of those were written out.
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "fuzz_host.h"
#include "hx_file.h"
#include "hx_library.h"
#include "port_msg.h"
#include "sealed_file.h"
#include "vrx.h"

namespace {

unsigned long long tried = 0, accepted = 0, written = 0;
Port_MsgLevel worst = PORT_MSG_STATUS;

void hear_levels() {
    static const bool done = [] {
        quiet_and_alive();
        Port_MsgDispatcher::set_sink([](Port_MsgLevel level, const Port_MsgLocation&,
                                        std::string_view) { worst = std::max(worst, level); });
        std::atexit([] {
            std::fprintf(stderr, "writer_fuzz: %llu decoded, %llu accepted, %llu written\n", tried,
                         accepted, written);
        });
        return true;
    }();
    (void)done;
}

void read_back(const char* path, HX_FILE_TYPE kind) {
    VX_STATUS status = VX_OK;
    HX_LIBRARY* library = nullptr;
    {
        VRX vrx;
        status = vrx.vrx_read(path, kind == HX_FILE_DESIGN, 0, 1);
        library = vrx.get_library();
    }
    if (library != nullptr) hx_env.delete_library(library);
    if (status == VX_OK || status == VX_DRC_ERROR) return;
    std::rename(path, (std::string(path) + ".failed").c_str());  // kept for a look
    __builtin_trap();
}

void decode_and_write(const void* data, size_t size) {
    static const std::string path =
        "/dev/shm/vrx_writer_fuzz_" + std::to_string(::getpid()) + ".vrx";
    HX_FILE_TYPE kind = HX_FILE_IO::kind_of(data, size);
    if (kind == HX_FILE_UNKNOWN) kind = HX_FILE_DESIGN;
    std::string reason;
    ++tried;
    auto library = HX_FILE_IO::decode(data, size, kind, reason);
    if (library == nullptr) return;
    ++accepted;
    HX_DESIGN* design = nullptr;
    if (kind == HX_FILE_DESIGN) {
        auto* links = library->create_liblink_iter();
        design = links->l_next()->get_design();
        library->delete_liblink_iter(links);
    }
    worst = PORT_MSG_STATUS;
    VX_STATUS status = VX_OK;
    {
        VRX vrx;
        status = VRX_TEST_ACCESS::write_file(vrx, design, library.get(), path.c_str());
    }
    if (status == VX_OK && worst <= PORT_MSG_INFO) {
        ++written;
        read_back(path.c_str(), kind);
    }
    std::remove(path.c_str());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    hear_levels();
    read_raw_and_sealed(data, size, decode_and_write);
    return 0;
}
