// Runs a command-line tool as a child process, for the tool tests: its exit
// status and what it wrote to standard output and standard error.
#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>

#include <string>
#include <string_view>
#include <vector>

#include "scratch_dir.h"

extern char** environ;

namespace vrx_test {

struct ToolRun {
    int status = -1;  ///< exit status; -1 when the program did not exit normally
    std::string out;
    std::string err;
};

/// Where a run happens and where its output goes.
struct ToolPlace {
    std::string work_dir;     ///< the tool's working directory
    std::string tmp_dir;      ///< the tool's TMPDIR
    std::string capture_dir;  ///< holds the files that take standard output and error
    std::string stdout_path;  ///< standard output goes here instead when set (not read back)
};

/// Runs `program` with `args`; the rest of the environment is the test's own.
inline ToolRun run_tool(const char* program, const std::vector<std::string>& args,
                        const ToolPlace& place) {
    const std::string out_path =
        place.stdout_path.empty() ? place.capture_dir + "/stdout" : place.stdout_path;
    const std::string err_path = place.capture_dir + "/stderr";
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, out_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    posix_spawn_file_actions_addopen(&actions, 2, err_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    posix_spawn_file_actions_addchdir_np(&actions, place.work_dir.c_str());

    std::vector<char*> argv{const_cast<char*>(program)};
    for (const std::string& arg : args)
        argv.push_back(const_cast<char*>(arg.c_str()));
    argv.push_back(nullptr);
    std::string tmpdir = "TMPDIR=" + place.tmp_dir;
    std::vector<char*> envp{tmpdir.data()};
    for (char** entry = environ; *entry != nullptr; ++entry) {
        if (!std::string_view(*entry).starts_with("TMPDIR=")) envp.push_back(*entry);
    }
    envp.push_back(nullptr);

    ToolRun result;
    pid_t pid = 0;
    const int spawned = posix_spawn(&pid, program, &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    if (spawned != 0) {
        ADD_FAILURE() << "cannot start " << program;
        return result;
    }
    int wait_status = 0;
    waitpid(pid, &wait_status, 0);
    if (WIFEXITED(wait_status)) result.status = WEXITSTATUS(wait_status);
    if (place.stdout_path.empty()) result.out = ScratchDir::read_file(out_path);
    result.err = ScratchDir::read_file(err_path);
    return result;
}

}  // namespace vrx_test
