#include "recorder.h"

#include <gtest/gtest.h>

#include <utility>

ParseLog* ParseLog::current = nullptr;

ParseLog::ParseLog() {
    current = this;
    old_sink_ = Port_MsgDispatcher::set_sink(
        [this](Port_MsgLevel level, const Port_MsgLocation& where, std::string_view text) {
            EXPECT_EQ(where.module, "Quorra");
            EXPECT_EQ(where.file, "../s/vrx");
            EXPECT_GT(where.line, 0);
            EXPECT_EQ(where.revision, "$Revision: 1.3 $");
            record(std::string(Port_MsgDispatcher::level_name(level)) + ": " + std::string(text),
                   false);
        });
    old_exit_ = Port_MsgDispatcher::set_exit_handler(
        [this](int code) { record("exit(" + std::to_string(code) + ")", false); });
}

ParseLog::~ParseLog() {
    Port_MsgDispatcher::set_sink(std::move(old_sink_));
    Port_MsgDispatcher::set_exit_handler(std::move(old_exit_));
    current = nullptr;
}

void ParseLog::record(std::string entry, bool is_callback) {
    events.push_back(entry);
    if (is_callback && on_callback) on_callback(entry);
}

TextInput::TextInput(const std::string& text) : file_(std::tmpfile()) {
    std::fwrite(text.data(), 1, text.size(), file_);
    std::rewind(file_);
    vrx_set_input(file_);
}

TextInput::~TextInput() {
    vrx_set_input(nullptr);
    std::fclose(file_);
}

Parsed parse_text(const std::string& text,
                  const std::function<void(const std::string&)>& on_callback) {
    ParseLog log;
    log.on_callback = on_callback;
    TextInput input(text);
    vrx_parse_init();
    const int32_t result = vrx_parse();
    return {result, log.events};
}

// --- The callbacks -----------------------------------------------------------

namespace {

std::string text(const char* s) {
    return s ? s : "null";
}

std::string list(const VX_PROP_ARRAY* props) {
    if (!props) return "null";
    std::string out = "{";
    for (int32_t i = 0; i < props->count; ++i) {
        if (i > 0) out += ", ";
        out += std::string(props->entries[i].name) + "=" + props->entries[i].value;
    }
    return out + "}";
}

void call(const std::string& what) {
    ASSERT_NE(ParseLog::current, nullptr) << "callback outside a ParseLog: " << what;
    ParseLog::current->record(what + " @" + std::to_string(line_number), true);
}

}  // namespace

void vrx_do_library_props(VX_PROP_ARRAY* props) {
    call("do_library_props(" + list(props) + ")");
}
void vrx_begin_design(const char* name, VX_PROP_ARRAY* props) {
    call("begin_design(" + text(name) + ", " + list(props) + ")");
}
void vrx_end_design() {
    call("end_design()");
}
void vrx_add_alias(const char* name, const char* alias) {
    call("add_alias(" + text(name) + ", " + text(alias) + ")");
}
void vrx_begin_block(const char* name, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props) {
    call("begin_block(" + text(name) + ", " + std::to_string(width) + ", " +
         std::to_string(physical) + ", " + list(props) + ")");
}
void vrx_begin_prim(const char* type, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props) {
    call("begin_prim(" + text(type) + ", " + std::to_string(width) + ", " +
         std::to_string(physical) + ", " + list(props) + ")");
}
void vrx_end_block() {
    call("end_block()");
}
void vrx_do_pin(const char* name, VX_PROP_ARRAY* props) {
    call("do_pin(" + text(name) + ", " + list(props) + ")");
}
void vrx_do_signal(const char* name, VX_SIGNAL_TYPE kind, VX_PROP_ARRAY* props) {
    call("do_signal(" + text(name) + ", " + (kind == VX_SIGNAL ? "VX_SIGNAL" : "VX_PHYSSIGNAL") +
         ", " + list(props) + ")");
}
void vrx_do_mapsignal(const char* block, const char* pin, VX_PROP_ARRAY* props) {
    call("do_mapsignal(" + text(block) + ", " + text(pin) + ", " + list(props) + ")");
}
void vrx_add_mapconn(const char* block, const char* pin, VX_PROP_ARRAY* props) {
    call("add_mapconn(" + text(block) + ", " + text(pin) + ", " + list(props) + ")");
}
void vrx_set_parser_status(VX_PARSER_STATUS status) {
    if (ParseLog::current) ParseLog::current->statuses.push_back(status);
}
