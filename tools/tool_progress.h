// What the tools show while they convert, shared by both.
//
// On a terminal, a long conversion shows how far it has come on standard
// error: one line ("reading top.vrx: 48.2 MB of 156.5 MB (31%)"), shown when
// a step starts, redrawn in place at most five times a second, and erased
// when the step ends and before any message is printed, so that messages
// never mix with it. Nothing of it is written when standard error is not a
// terminal, nor with -q, which also drops status messages; warnings, errors
// and fatal messages always appear.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <string>

namespace vrx_tool {

/// The text of one progress report: "<what>: <done> of <total> (<percent>)",
/// or "<what>: <done>" when the total is not known.
std::string progress_text(const char* what, uint64_t done, uint64_t total);

/// One progress line on a terminal.
class ProgressLine {
  public:
    using Clock = std::chrono::steady_clock;
    static constexpr Clock::duration kInterval = std::chrono::milliseconds(200);

    /// `width` is the terminal's: longer texts lose their beginning.
    ProgressLine(std::FILE* stream, std::size_t width) : stream_(stream), width_(width) {}

    /// A converter's progress hook (VX_PROGRESS_FN); `line` is the ProgressLine.
    static void report(void* line, const char* what, uint64_t done, uint64_t total);
    /// Shows the report unless the last one shown is of the same step and
    /// younger than kInterval.
    void report_at(Clock::time_point now, const char* what, uint64_t done, uint64_t total);
    /// Erases the line when one is shown.
    void clear();

  private:
    void draw(std::string text);

    std::FILE* stream_;
    std::size_t width_;
    std::size_t shown_ = 0;  // columns the line takes on screen; 0: none shown
    std::string last_what_;  // the step of the last report shown
    Clock::time_point last_draw_{};
};

/// Installs the tools' message sink: every message first erases the progress
/// line, and with `quiet` status and info messages are dropped. When the
/// converted output goes to standard output, status lines go to standard
/// error instead, so that they do not mix with it. Returns the
/// process-wide progress line to hand to VRX::set_progress (with
/// ProgressLine::report) when standard error is a terminal and `quiet` is
/// clear, else null.
ProgressLine* set_up_output(bool quiet, bool output_on_stdout = false);

}  // namespace vrx_tool
