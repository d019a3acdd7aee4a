// Recording versions of the reader's callbacks. One log holds, in the order
// they happen, every callback (with its arguments and `line_number` at the
// call), every message the reader issues and every exit request.
#pragma once

#include <cstdio>
#include <functional>
#include <string>
#include <vector>

#include "port_msg.h"
#include "vrx_parser.h"

class ParseLog {
  public:
    ParseLog();
    ~ParseLog();
    ParseLog(const ParseLog&) = delete;
    ParseLog& operator=(const ParseLog&) = delete;

    /// Entries such as "begin_block(u1, 3, 0, {NAME=x, TYPE=}) @5",
    /// "ERROR: Line number 3: parse error\n" and "exit(2)".
    std::vector<std::string> events;
    /// Status values passed to vrx_set_parser_status, in order.
    std::vector<VX_PARSER_STATUS> statuses;
    /// Runs inside every grammar callback with its log entry, so that a test
    /// can act as a builder method would (report, check state).
    std::function<void(const std::string& entry)> on_callback;

    static ParseLog* current;
    void record(std::string entry, bool is_callback);

  private:
    Port_MsgSink old_sink_;
    Port_ExitHandler old_exit_;
};

/// `text` as the reader's input stream for the object's lifetime.
class TextInput {
  public:
    explicit TextInput(const std::string& text);
    ~TextInput();
    TextInput(const TextInput&) = delete;
    TextInput& operator=(const TextInput&) = delete;

  private:
    std::FILE* file_;
};

/// Parses `text` as a fresh file: the result of vrx_parse, then the log.
struct Parsed {
    int32_t result;
    std::vector<std::string> events;
};
Parsed parse_text(const std::string& text,
                  const std::function<void(const std::string&)>& on_callback = nullptr);
