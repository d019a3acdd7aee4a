// The benchmarks' large design: one million two-input AND gates with random
// connections, built the way the text reader builds one (signals found or
// made by name through the converter's signal cache, one connection per pin).
#pragma once

#include <cstdint>
#include <cstdio>
#include <random>

#include "hx_library.h"
#include "port_msg.h"
#include "vrx.h"

inline constexpr uint32_t kGates = 1'000'000;
inline constexpr uint32_t kPinsPerGate = 3;

/// Builds the gates into a fresh library; signal n<i> is gate i's output and
/// each input names a random n<j>, made on first mention as a reader would.
/// The same gate count always gives the same design.
inline HX_DESIGN* build_and_design(HX_LIBRARY& library, uint32_t gates) {
    HX_DESIGN* design = library.create_design("ands");
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 0, "ands");
    VX_SIGNALCACHE signals;
    signals.design = design;
    std::mt19937 random(12345);
    std::uniform_int_distribution<uint32_t> pick(0, gates - 1);
    char name[16];
    for (uint32_t i = 0; i < gates; ++i) {
        HX_LOGPRIM* gate = design->create_logprim(root, HX_PRIM_AND, 2, nullptr);
        for (uint16_t pin = 0; pin < kPinsPerGate; ++pin) {
            std::snprintf(name, sizeof name, "n%u", pin == 2 ? i : pick(random));
            design->create_conn(signals.find_or_create(name, 0), gate, pin);
        }
    }
    return design;
}

/// Keeps a benchmark's own output clean of status messages: only errors and
/// worse reach standard error.
inline void show_only_errors() {
    Port_MsgDispatcher::set_sink(
        [](Port_MsgLevel level, const Port_MsgLocation&, std::string_view text) {
            if (level >= PORT_MSG_ERROR) std::fwrite(text.data(), 1, text.size(), stderr);
        });
}
