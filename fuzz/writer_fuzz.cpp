// Feeds the text writer every design and library that the database file
// reader accepts from arbitrary bytes (as they are, and with a header made
// to match them, as in hx_file_fuzz). Writing must never crash or touch
// memory it should not, whatever the names, properties and structure; fatal
// reports (values the text cannot carry) come back to the writer, which must
// carry on safely. Text written without a warning, an error or a fatal
// report must read back without a parse error. At exit the run tells how
// many inputs the decoder accepted and how many of those were written out.
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "fuzz_host.h"
#include "hx_file.h"
#include "hx_library.h"
#include "port_file.h"
#include "port_msg.h"
#include "sealed_file.h"
#include "vrx.h"

namespace {

struct Counts {
    unsigned long long tried = 0;     // decoded
    unsigned long long accepted = 0;  // the decoder accepted
    unsigned long long written = 0;   // written without a report above info
    unsigned long long read_back = 0;
};
Counts counts;
Port_MsgLevel worst = PORT_MSG_STATUS;

void print_counts() {
    std::fprintf(stderr,
                 "writer_fuzz: %llu decoded, %llu accepted, %llu written cleanly, %llu read back\n",
                 counts.tried, counts.accepted, counts.written, counts.read_back);
}

void hear_levels() {
    static const bool done = [] {
        quiet_and_alive();
        Port_MsgDispatcher::set_sink(
            [](Port_MsgLevel level, const Port_MsgLocation&, std::string_view) {
                if (level > worst) worst = level;
            });
        std::atexit(print_counts);
        return true;
    }();
    (void)done;
}

const std::string& text_path() {
    static const std::string path =
        "/dev/shm/vrx_writer_fuzz_" + std::to_string(::getpid()) + ".vrx";
    return path;
}

void read_back(HX_FILE_TYPE kind) {
    HX_LIBRARY* library = nullptr;
    VX_STATUS status = VX_OK;
    {
        VRX vrx;
        status = vrx.vrx_read(text_path().c_str(), kind == HX_FILE_DESIGN, 0, 1);
        library = vrx.get_library();
    }
    if (library != nullptr) hx_env.delete_library(library);
    if (status != VX_OK && status != VX_DRC_ERROR) __builtin_trap();
    ++counts.read_back;
}

void decode_and_write(const void* data, size_t size) {
    HX_FILE_TYPE kind = HX_FILE_IO::kind_of(data, size);
    if (kind == HX_FILE_UNKNOWN) kind = HX_FILE_DESIGN;
    std::string reason;
    ++counts.tried;
    auto library = HX_FILE_IO::decode(data, size, kind, reason);
    if (library == nullptr) return;
    ++counts.accepted;
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
        status = VRX_TEST_ACCESS::write_file(vrx, design, library.get(), text_path().c_str());
    }
    if (status == VX_OK && worst <= PORT_MSG_INFO) {
        ++counts.written;
        read_back(kind);
    }
    std::remove(text_path().c_str());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    hear_levels();
    read_raw_and_sealed(data, size, decode_and_write);
    return 0;
}
