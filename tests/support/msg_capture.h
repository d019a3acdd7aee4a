// Captures the message manager's reports and exit requests for a test's
// lifetime, and restores the former sink and exit handler afterwards.
#pragma once

#include <string>
#include <vector>

#include "port_msg.h"

struct CapturedMsg {
    Port_MsgLevel level;
    std::string module;
    std::string file;
    int line;
    std::string revision;
    std::string text;
};

class MsgCapture {
  public:
    MsgCapture();
    ~MsgCapture();
    MsgCapture(const MsgCapture&) = delete;
    MsgCapture& operator=(const MsgCapture&) = delete;

    const std::vector<CapturedMsg>& messages() const { return messages_; }
    /// Exit codes passed to the exit handler, in order.
    const std::vector<int>& exits() const { return exits_; }
    /// The texts of the reports at one level, in order.
    std::vector<std::string> texts(Port_MsgLevel level) const;
    void clear();

  private:
    std::vector<CapturedMsg> messages_;
    std::vector<int> exits_;
    Port_MsgSink old_sink_;
    Port_ExitHandler old_exit_;
};
