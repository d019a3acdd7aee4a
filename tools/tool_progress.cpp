#include "tool_progress.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <string_view>

#include "port_msg.h"

namespace vrx_tool {

namespace {

constexpr std::size_t kDefaultWidth = 80;
constexpr std::string_view kCut = "...";

std::string amount(uint64_t bytes) {
    char text[32];
    const auto value = static_cast<double>(bytes);
    if (bytes < 1'000'000)
        std::snprintf(text, sizeof text, "%.1f kB", value / 1e3);
    else if (bytes < 1'000'000'000)
        std::snprintf(text, sizeof text, "%.1f MB", value / 1e6);
    else
        std::snprintf(text, sizeof text, "%.2f GB", value / 1e9);
    return text;
}

unsigned percent(uint64_t done, uint64_t total) {
    if (done >= total) return 100;
    return static_cast<unsigned>(static_cast<double>(done) * 100.0 / static_cast<double>(total));
}

std::size_t terminal_width(int fd) {
    winsize size{};
    if (ioctl(fd, TIOCGWINSZ, &size) != 0 || size.ws_col == 0) return kDefaultWidth;
    return size.ws_col;
}

}  // namespace

std::string progress_text(const char* what, uint64_t done, uint64_t total) {
    std::string text = what;
    text += ": ";
    text += amount(done);
    if (total == 0) return text;
    text += " of ";
    text += amount(total);
    text += " (";
    text += std::to_string(percent(done, total));
    text += "%)";
    return text;
}

// --- ProgressLine ----------------------------------------------------------------

void ProgressLine::report(void* line, const char* what, uint64_t done, uint64_t total) {
    static_cast<ProgressLine*>(line)->report_at(Clock::now(), what, done, total);
}

void ProgressLine::report_at(Clock::time_point now, const char* what, uint64_t done,
                             uint64_t total) {
    if (now - last_draw_ < kInterval && last_what_ == what) return;
    draw(progress_text(what, done, total));
    last_what_ = what;
    last_draw_ = now;
}

// A line longer than the terminal would wrap, and "\r" would then redraw
// only its last part: the text keeps its end, which changes.
void ProgressLine::draw(std::string text) {
    if (width_ > kCut.size() + 1 && text.size() > width_ - 1)
        text = std::string(kCut) + text.substr(text.size() - (width_ - 1 - kCut.size()));
    std::string line = "\r" + text;
    if (shown_ > text.size()) line.append(shown_ - text.size(), ' ');
    std::fputs(line.c_str(), stream_);
    std::fflush(stream_);
    shown_ = text.size();
}

void ProgressLine::clear() {
    if (shown_ == 0) return;
    const std::string blank = "\r" + std::string(shown_, ' ') + "\r";
    std::fputs(blank.c_str(), stream_);
    std::fflush(stream_);
    shown_ = 0;
}

// --- messages --------------------------------------------------------------------

ProgressLine* set_up_output(bool quiet, bool output_on_stdout) {
    static ProgressLine line(stderr, terminal_width(STDERR_FILENO));
    ProgressLine* shown = !quiet && isatty(STDERR_FILENO) ? &line : nullptr;
    Port_MsgDispatcher::set_sink([shown, quiet, output_on_stdout](Port_MsgLevel level,
                                                                  const Port_MsgLocation& where,
                                                                  std::string_view text) {
        if (quiet && level <= PORT_MSG_INFO) return;
        if (shown != nullptr) shown->clear();
        if (level == PORT_MSG_STATUS && output_on_stdout) {
            std::fwrite(text.data(), 1, text.size(), stderr);
            return;
        }
        Port_MsgDispatcher::default_sink(level, where, text);
    });
    return shown;
}

}  // namespace vrx_tool
