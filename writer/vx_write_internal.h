// What the writer's source files share, and what the converter's write
// pipeline asks of the writer. Not part of the library's interface.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include "port_msg.h"
#include "vx_text.h"

/// Message object of the writer's own reports.
inline Port_MsgManData vx_write_msg(int line) {
    return Port_MsgManData::createObject("Quorra", "basvxwrite", line, "$Revision: 1.3 $");
}

/// The writer reports a fatal error through this: the report ends the run,
/// and when the host's exit handler returns instead, the file being written
/// is known to be incomplete and vrx_write refuses it.
void vx_write_fatal(int line, const char* format, ...) UT_PRINTF_FORMAT(2, 3);
/// True when a fatal report was issued since the last reset.
bool vx_write_fatal_seen();
void vx_write_reset_fatal();

/// Appends "OBJ_$" and the identity in lower-case hexadecimal.
void vx_append_invented(std::string& out, uint32_t identity);
/// Appends a signed decimal number.
void vx_append_int(std::string& out, long long value);
