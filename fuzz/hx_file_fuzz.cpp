// Feeds arbitrary bytes to the database file reader, as they are and with a
// header made to match them (right length and checksum), so that mutations
// reach the content decoder rather than stopping at the checksum. Whatever
// the reader accepts must write back and read again to the same bytes.
#include <cstddef>
#include <cstdint>
#include <string>

#include "hx_file.h"
#include "hx_library.h"
#include "port_msg.h"
#include "sealed_file.h"

namespace {

void silence_messages() {
    static const bool silenced = [] {
        Port_MsgDispatcher::set_sink(
            [](Port_MsgLevel, const Port_MsgLocation&, std::string_view) {});
        return true;
    }();
    (void)silenced;
}

std::string encode(const HX_LIBRARY& library, HX_FILE_TYPE kind) {
    if (kind == HX_FILE_LIBRARY) return HX_FILE_IO::encode(library);
    auto* links = library.create_liblink_iter();
    const HX_DESIGN* design = links->l_next()->get_design();
    library.delete_liblink_iter(links);
    return HX_FILE_IO::encode(*design);
}

void check_round_trip(const HX_LIBRARY& library, HX_FILE_TYPE kind) {
    const std::string once = encode(library, kind);
    std::string reason;
    auto again = HX_FILE_IO::decode(once.data(), once.size(), kind, reason);
    if (again == nullptr || encode(*again, kind) != once) __builtin_trap();
}

void decode_and_check(const void* data, size_t size) {
    HX_FILE_TYPE kind = HX_FILE_IO::kind_of(data, size);
    if (kind == HX_FILE_UNKNOWN) kind = HX_FILE_DESIGN;
    std::string reason;
    auto library = HX_FILE_IO::decode(data, size, kind, reason);
    if (library == nullptr) {
        if (reason.empty()) __builtin_trap();  // every refusal has a reason
        return;
    }
    check_round_trip(*library, kind);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    silence_messages();
    read_raw_and_sealed(data, size, decode_and_check);
    return 0;
}
