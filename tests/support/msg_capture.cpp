#include "msg_capture.h"

MsgCapture::MsgCapture() {
    old_sink_ = Port_MsgDispatcher::set_sink(
        [this](Port_MsgLevel level, const Port_MsgLocation& where, std::string_view text) {
            messages_.push_back({level, std::string(where.module), std::string(where.file),
                                 where.line, std::string(where.revision), std::string(text)});
        });
    old_exit_ = Port_MsgDispatcher::set_exit_handler([this](int code) { exits_.push_back(code); });
}

MsgCapture::~MsgCapture() {
    Port_MsgDispatcher::set_sink(std::move(old_sink_));
    Port_MsgDispatcher::set_exit_handler(std::move(old_exit_));
}

std::vector<std::string> MsgCapture::texts(Port_MsgLevel level) const {
    std::vector<std::string> out;
    for (const CapturedMsg& m : messages_) {
        if (m.level == level) out.push_back(m.text);
    }
    return out;
}

void MsgCapture::clear() {
    messages_.clear();
    exits_.clear();
}
