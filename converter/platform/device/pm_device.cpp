#include "pm_device.h"

#include <dlfcn.h>
#include <sys/stat.h>

#include <cstdlib>
#include <string_view>

#include "port_msg.h"

namespace {

bool is_plain_name(const char* name) {
    if (name == nullptr || *name == '\0' || *name == '.') return false;
    for (const char* p = name; *p != '\0'; ++p) {
        if (*p == '/') return false;
    }
    return true;
}

std::string lower(const char* name) {
    std::string s = name;
    for (char& c : s) {
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    }
    return s;
}

bool is_regular_file(const std::string& path) {
    struct stat st;
    return ::stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode);
}

std::string in_dir(std::string_view dir, const std::string& file) {
    std::string path(dir);
    if (path.back() != '/') path += '/';
    return path + file;
}

}  // namespace

PM_SPEC::PM_SPEC(const char* partname, PM_PARTNAME_BINDING binding)
    : partname_(partname ? partname : ""), binding_(binding) {}

std::string PM_SPEC::device_folder() {
    Dl_info info{};
    if (::dladdr(reinterpret_cast<void*>(&PM_SPEC::device_folder), &info) == 0 ||
        info.dli_fname == nullptr) {
        return "";
    }
    char* resolved = ::realpath(info.dli_fname, nullptr);
    std::string module = resolved ? resolved : info.dli_fname;
    std::free(resolved);
    const auto slash = module.find_last_of('/');
    const std::string dir = slash == std::string::npos ? "." : module.substr(0, slash);
    return dir + "/../share/vrx/devices";
}

std::string PM_SPEC::find_device_file(const char* name) {
    if (!is_plain_name(name)) return "";
    const std::string file = lower(name) + ".acd";
    if (const char* path = std::getenv("HX_DEVICE_PATH")) {
        std::string_view rest = path;
        while (true) {
            const auto colon = rest.find(':');
            const std::string_view dir = rest.substr(0, colon);
            // An empty entry names no directory (it does not mean ".").
            if (!dir.empty() && is_regular_file(in_dir(dir, file))) return in_dir(dir, file);
            if (colon == std::string_view::npos) break;
            rest.remove_prefix(colon + 1);
        }
    }
    const std::string folder = device_folder();
    if (!folder.empty()) {
        const std::string candidate = in_dir(folder, file);
        if (is_regular_file(candidate)) return candidate;
    }
    return "";
}

bool PM_SPEC::isvalidpmname(const char* name, int report_quietly) const {
    if (!find_device_file(name).empty()) return true;
    if (report_quietly == 0) {
        PORT_MSG("Device", "$Revision: 1.0 $")
            .issueWarning("no device description found for '%s'\n", name ? name : "");
    }
    return false;
}

PM_PIC::PM_PIC(const char* device, const char* package, const char* speed)
    : device_(device ? device : ""), package_(package ? package : ""), speed_(speed ? speed : "") {}
