// Text to database on arbitrary bytes: the first byte chooses design or
// library mode, a derived physical root and grafting; the rest is the text.
// Reading must never crash, hang or touch memory it should not, whatever the
// statements say; the error limit and the fatal PHYSICAL stop come back to
// the reader through an exit handler that returns. Whatever was built is
// then stored as a database file in memory, read back, and written as text
// to /dev/null, so that odd designs built from text also meet the file
// format and the writer.
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <string>

#include "fuzz_host.h"
#include "hx_file.h"
#include "hx_library.h"
#include "port_file.h"
#include "port_msg.h"
#include "vrx.h"

namespace {

const std::string& input_path() {
    static const std::string path =
        "/dev/shm/vrx_builder_fuzz_" + std::to_string(::getpid()) + ".vrx";
    return path;
}

bool store(const uint8_t* data, size_t size) {
    std::FILE* file = std::fopen(input_path().c_str(), "wb");
    if (file == nullptr) return false;
    const bool ok = std::fwrite(data, 1, size, file) == size;
    return std::fclose(file) == 0 && ok;
}

// The database file of what was built must read back.
template <class Object>
void round_trip_file(const Object& object, HX_FILE_TYPE kind) {
    const std::string bytes = HX_FILE_IO::encode(object);
    std::string reason;
    if (HX_FILE_IO::decode(bytes.data(), bytes.size(), kind, reason) == nullptr) __builtin_trap();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    quiet_and_alive();
    if (size == 0 || !store(data + 1, size - 1)) return 0;
    const uint8_t flags = data[0];
    HX_LIBRARY* library = nullptr;
    {
        VRX vrx;
        const VX_STATUS status =
            vrx.vrx_read(input_path().c_str(), flags & 1, (flags >> 1) & 1, (flags >> 2) & 1);
        library = vrx.get_library();
        HX_DESIGN* design = (flags & 1) ? vrx.get_design() : nullptr;
        const bool built = (flags & 1) ? design != nullptr : library != nullptr;
        if ((status == VX_OK || status == VX_DRC_ERROR) && built) {
            if (design != nullptr)
                round_trip_file(*design, HX_FILE_DESIGN);
            else
                round_trip_file(*library, HX_FILE_LIBRARY);
            VRX_TEST_ACCESS::write_to_null(vrx, design, library);
        }
    }
    if (library != nullptr) hx_env.delete_library(library);
    return 0;
}
