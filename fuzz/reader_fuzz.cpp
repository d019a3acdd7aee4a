// The reader on arbitrary bytes: it must never crash, hang or read out of
// bounds, and what it hands on must stay within its limits. The callbacks
// check that every text is terminated within 1024 bytes, every list holds at
// most 256 properties, `line_number` never goes back, and the calls nest as
// the grammar says (designs hold blocks, blocks hold pins).
#include <cstdint>
#include <cstdio>
#include <cstring>

#include "port_msg.h"
#include "vrx_parser.h"

namespace {

struct Nesting {
    bool library_done = false;
    bool in_design = false;
    bool in_block = false;
    bool in_map = false;
    int32_t line = 1;
};

Nesting state;

void check(bool ok) {
    if (!ok) __builtin_trap();
}

void check_text(const char* text) {
    check(text != nullptr && std::memchr(text, '\0', VX_MAX_TEXT + 1) != nullptr);
}

void check_props(const VX_PROP_ARRAY* props) {
    check(props == &prop_array);
    check(props->count >= 0 && props->count <= VX_MAX_PROPS);
    for (int32_t i = 0; i < props->count; ++i) {
        check_text(props->entries[i].name);
        check_text(props->entries[i].value);
    }
}

// Every grammar callback: the library's list came first, lines only advance.
void enter(bool want_design, bool want_block) {
    check(line_number >= state.line);
    state.line = line_number;
    check(state.library_done);
    check(state.in_design == want_design && state.in_block == want_block);
}

}  // namespace

void vrx_do_library_props(VX_PROP_ARRAY* props) {
    check(!state.library_done);
    check_props(props);
    state.library_done = true;
}
void vrx_begin_design(const char* name, VX_PROP_ARRAY* props) {
    enter(false, false);
    check_text(name);
    check_props(props);
    state.in_design = true;
    state.in_map = false;
}
void vrx_end_design() {
    enter(true, false);
    state.in_design = false;
}
void vrx_add_alias(const char* name, const char* alias) {
    enter(false, false);
    check_text(name);
    check_text(alias);
}
void vrx_begin_block(const char* name, uint16_t, uint8_t physical, VX_PROP_ARRAY* props) {
    enter(true, false);
    check_text(name);
    check(physical <= 1);
    check_props(props);
    state.in_block = true;
}
void vrx_begin_prim(const char* type, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props) {
    vrx_begin_block(type, width, physical, props);
}
void vrx_end_block() {
    enter(true, true);
    state.in_block = false;
}
void vrx_do_pin(const char* name, VX_PROP_ARRAY* props) {
    enter(true, true);
    check_text(name);
    check_props(props);
}
void vrx_do_signal(const char* name, VX_SIGNAL_TYPE kind, VX_PROP_ARRAY* props) {
    enter(true, false);
    check(!state.in_map);
    check_text(name);
    check(kind == VX_SIGNAL || kind == VX_PHYSSIGNAL);
    check_props(props);
}
void vrx_do_mapsignal(const char* block, const char* pin, VX_PROP_ARRAY* props) {
    enter(true, false);
    check_text(block);
    check((pin == nullptr) == (props == nullptr));
    if (pin) {
        check_text(pin);
        check_props(props);
    }
    state.in_map = true;
}
void vrx_add_mapconn(const char* block, const char* pin, VX_PROP_ARRAY* props) {
    enter(true, false);
    check(state.in_map);
    check_text(block);
    if (pin) check_text(pin);
    check_props(props);
}
void vrx_set_parser_status(VX_PARSER_STATUS status) {
    check(status == VX_PARSER_ERROR);
}

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    // Unclosed quotes are echoed to standard output; reports and exits are dropped.
    check(std::freopen("/dev/null", "w", stdout) != nullptr);
    Port_MsgDispatcher::set_sink([](Port_MsgLevel, const Port_MsgLocation&, std::string_view) {});
    Port_MsgDispatcher::set_exit_handler([](int code) { check(code == 2); });
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::FILE* input = fmemopen(const_cast<uint8_t*>(data), size, "r");
    if (!input) return 0;
    state = Nesting{};
    vrx_set_input(input);
    vrx_parse_init();
    const int32_t result = vrx_parse();
    check(result == 0 || result == 1);
    check(error_count <= 20);
    if (result == 0) check(state.library_done && !state.in_design && !state.in_block);
    vrx_set_input(nullptr);
    std::fclose(input);
    return 0;
}
