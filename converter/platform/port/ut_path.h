// Path pieces. Only "/" separates directories. The extension is the text after
// the last dot of the last path component, unless that dot starts the
// component (".profile" has none); a dot in a directory name is never an
// extension. "top." has an empty extension.
#pragma once

#include <string>

class UT_PATH {
  public:
    /// The last component without its extension: "dir/top.vrx" gives "top".
    static const char* GetBase(const char* path, std::string& out);
    /// Points at the extension inside path ("vrx", no dot), or null when none.
    static const char* GetExt(const char* path);
    /// The path without its extension: "dir/top.vrx" gives "dir/top".
    static const char* GetRoot(const char* path, std::string& out);
};
