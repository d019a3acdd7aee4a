// The version of the library a program runs with, which may be newer than
// the headers it was built against.
#include "vrx.h"

const char* vrx_library_version() {
    return VRX_VERSION_TEXT;
}
