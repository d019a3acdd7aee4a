// A fresh directory for one test, removed with everything in it afterwards.
#pragma once

#include <string>
#include <vector>

class ScratchDir {
  public:
    ScratchDir();
    ~ScratchDir();
    ScratchDir(const ScratchDir&) = delete;
    ScratchDir& operator=(const ScratchDir&) = delete;

    const std::string& path() const { return path_; }
    std::string file(const std::string& name) const { return path_ + "/" + name; }
    /// Names of the entries in the directory, sorted.
    std::vector<std::string> entries() const;

    static void write_file(const std::string& path, const std::string& bytes);
    static std::string read_file(const std::string& path);
    static bool exists(const std::string& path);

  private:
    std::string path_;
};
