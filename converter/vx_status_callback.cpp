// The reader's diagnostics mark the parse failed through this callback.
// Alone in its file: see vx_callbacks.cpp.
#include "vrx.h"

void vrx_set_parser_status(VX_PARSER_STATUS status) {
    if (active_vrx) active_vrx->set_parser_status(status);
}
