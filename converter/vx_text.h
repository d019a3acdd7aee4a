// Small helpers for texts that the database may leave absent, shared by the
// builder, the writer and the pipelines.
#pragma once

#include <cstring>

/// Never null.
inline const char* vx_text(const char* s) {
    return s != nullptr ? s : "";
}
inline bool vx_present(const char* s) {
    return s != nullptr && *s != '\0';
}
/// The name of a property or keyword equals `keyword` exactly.
inline bool vx_is(const char* name, const char* keyword) {
    return std::strcmp(name, keyword) == 0;
}
