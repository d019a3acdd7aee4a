#include "ut_path.h"

#include <cstring>

namespace {

const char* last_component(const char* path) {
    const char* slash = std::strrchr(path, '/');
    return slash ? slash + 1 : path;
}

// The dot that starts the extension, or null.
const char* extension_dot(const char* path) {
    const char* name = last_component(path);
    const char* dot = std::strrchr(name, '.');
    return (dot == nullptr || dot == name) ? nullptr : dot;
}

}  // namespace

const char* UT_PATH::GetBase(const char* path, std::string& out) {
    out.clear();
    if (path != nullptr) {
        const char* name = last_component(path);
        const char* dot = extension_dot(path);
        out.assign(name, dot ? static_cast<std::size_t>(dot - name) : std::strlen(name));
    }
    return out.c_str();
}

const char* UT_PATH::GetExt(const char* path) {
    if (path == nullptr) return nullptr;
    const char* dot = extension_dot(path);
    return dot ? dot + 1 : nullptr;
}

const char* UT_PATH::GetRoot(const char* path, std::string& out) {
    out.clear();
    if (path != nullptr) {
        const char* dot = extension_dot(path);
        out.assign(path, dot ? static_cast<std::size_t>(dot - path) : std::strlen(path));
    }
    return out.c_str();
}
