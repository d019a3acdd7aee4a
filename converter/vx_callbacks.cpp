// The text reader's statement callbacks: each statement it reads reaches the
// builder operation of the active converter, arguments unchanged. Without an
// active converter a statement has nowhere to go and is dropped.
//
// The callbacks live apart from the converter object (the status callback in
// vx_status_callback.cpp), so that a program may link the converter with
// callbacks of its own: the parser's tests record them instead.
#include "vrx.h"

void vrx_do_library_props(VX_PROP_ARRAY* props) {
    if (active_vrx) active_vrx->do_library_props(props);
}

void vrx_begin_design(const char* name, VX_PROP_ARRAY* props) {
    if (active_vrx) active_vrx->begin_design(name, props);
}

void vrx_end_design() {
    if (active_vrx) active_vrx->end_design();
}

void vrx_add_alias(const char* name, const char* alias) {
    if (active_vrx) active_vrx->add_alias(name, alias);
}

void vrx_begin_block(const char* name, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props) {
    if (active_vrx) active_vrx->begin_block(name, width, physical, props);
}

void vrx_begin_prim(const char* type, uint16_t width, uint8_t physical, VX_PROP_ARRAY* props) {
    if (active_vrx) active_vrx->begin_prim(type, width, physical, props);
}

void vrx_end_block() {
    if (active_vrx) active_vrx->end_block();
}

void vrx_do_pin(const char* name, VX_PROP_ARRAY* props) {
    if (active_vrx) active_vrx->do_pin(name, props);
}

void vrx_do_signal(const char* name, VX_SIGNAL_TYPE kind, VX_PROP_ARRAY* props) {
    if (active_vrx) active_vrx->do_signal(name, kind, props);
}

void vrx_do_mapsignal(const char* block, const char* pin, VX_PROP_ARRAY* props) {
    if (active_vrx) active_vrx->do_mapsignal(block, pin, props);
}

void vrx_add_mapconn(const char* block, const char* pin, VX_PROP_ARRAY* props) {
    if (active_vrx) active_vrx->add_mapconn(block, pin, props);
}
