// Device personality: which devices exist, and the device chosen for a design.
//
// A device is known when its description file "<name>.acd" (name in lower
// case) is found in one of the directories of HX_DEVICE_PATH (colon
// separated, searched first) or in the library's device folder,
// <directory of the program or library>/../share/vrx/devices, which holds in
// the build tree as after installation. A name is only ever looked up as a
// plain file name: one holding "/" or a NUL, or starting with ".", is unknown.
#pragma once

#include <string>

enum PM_PARTNAME_BINDING : int {
    PM_BIND_NONE = 0,
    PM_BIND_PART = 1,
    PM_BIND_DEVICE = 2,
};

class PM_SPEC {
  public:
    /// partname may be null; the binding records how it was chosen.
    PM_SPEC(const char* partname, PM_PARTNAME_BINDING binding);
    ~PM_SPEC() = default;

    /// True when the device description of name exists. With report clear, an
    /// unknown name is also reported at warning level.
    bool isvalidpmname(const char* name, int report_quietly) const;
    /// The path of name's description file, or "" when it is unknown.
    static std::string find_device_file(const char* name);
    /// The library's own device folder (see the file comment).
    static std::string device_folder();

    const char* partname() const { return partname_.c_str(); }
    PM_PARTNAME_BINDING binding() const { return binding_; }

  private:
    std::string partname_;
    PM_PARTNAME_BINDING binding_;
};

/// The device a design is placed in: its name and, when known, package and
/// speed grade.
class PM_PIC {
  public:
    PM_PIC(const char* device, const char* package, const char* speed);

    const char* get_device() const { return device_.c_str(); }
    const char* get_package() const { return package_.c_str(); }
    const char* get_speed() const { return speed_.c_str(); }

  private:
    std::string device_;
    std::string package_;
    std::string speed_;
};
