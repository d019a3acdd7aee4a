// Feeds the text writer every design and library that the database file
// reader accepts from arbitrary bytes (as they are, and with a header made
// to match them, as in hx_file_fuzz). Writing must never crash or touch
// memory it should not, whatever the names, properties and structure; fatal
// reports (values the text cannot carry) come back to the writer, which must
// carry on safely. The text goes to /dev/null.
#include <cstddef>
#include <cstdint>
#include <string>

#include "fuzz_host.h"
#include "hx_file.h"
#include "hx_library.h"
#include "port_file.h"
#include "port_msg.h"
#include "sealed_file.h"
#include "vrx.h"

namespace {

void decode_and_write(const void* data, size_t size) {
    HX_FILE_TYPE kind = HX_FILE_IO::kind_of(data, size);
    if (kind == HX_FILE_UNKNOWN) kind = HX_FILE_DESIGN;
    std::string reason;
    auto library = HX_FILE_IO::decode(data, size, kind, reason);
    if (library == nullptr) return;
    VRX vrx;
    HX_DESIGN* design = nullptr;
    if (kind == HX_FILE_DESIGN) {
        auto* links = library->create_liblink_iter();
        design = links->l_next()->get_design();
        library->delete_liblink_iter(links);
    }
    VRX_TEST_ACCESS::write_to_null(vrx, design, library.get());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    quiet_and_alive();
    read_raw_and_sealed(data, size, decode_and_write);
    return 0;
}
