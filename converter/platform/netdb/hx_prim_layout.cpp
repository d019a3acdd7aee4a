#include "hx_prim_layout.h"

#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <unordered_map>

namespace {

constexpr HX_PRIM_ROLE kEnd{-1, false};
#define ROLE(r)            \
    HX_PRIM_ROLE {         \
        HX_PPIN_##r, false \
    }
#define REPEAT(r)         \
    HX_PRIM_ROLE {        \
        HX_PPIN_##r, true \
    }

constexpr HX_PRIM_ROLE kBuf[] = {ROLE(IN), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kGate[] = {REPEAT(IN), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kMux[] = {ROLE(INA), ROLE(INB), ROLE(SEL), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kTri[] = {ROLE(IN), ROLE(CTL), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kSff[] = {ROLE(IN),   ROLE(CLK),  ROLE(CE),  ROLE(SET), ROLE(RST),
                                 ROLE(SSET), ROLE(SRST), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kFf[] = {ROLE(IN),  ROLE(CLK), ROLE(CE), ROLE(SET),
                                ROLE(RST), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kLatch[] = {ROLE(IN), ROLE(CTL), ROLE(SET), ROLE(RST), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kPad[] = {ROLE(PAD), kEnd};
constexpr HX_PRIM_ROLE kSource[] = {ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kRam[] = {ROLE(IN), REPEAT(ADR), ROLE(CE), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kRams[] = {ROLE(IN), REPEAT(ADR), ROLE(CLK), ROLE(CE), ROLE(OUT), kEnd};
constexpr HX_PRIM_ROLE kRamd[] = {ROLE(IN), REPEAT(WADR), REPEAT(RADR), ROLE(CLK),
                                  ROLE(CE), ROLE(OUT),    kEnd};
constexpr HX_PRIM_ROLE kRom[] = {REPEAT(ADR), ROLE(OUT), kEnd};

#undef ROLE
#undef REPEAT

constexpr const char* kRoleNames[HX_PIN_PRIMITIVE_TYPE_COUNT] = {
    "IN",  "OUT",  "CTL",  "CLK", "CE",  "SET", "RST",  "PAD",
    "ADR", "RADR", "WADR", "SEL", "INA", "INB", "SSET", "SRST",
};

bool valid_role(int32_t role) {
    return role >= 0 && role < HX_PIN_PRIMITIVE_TYPE_COUNT;
}

}  // namespace

const HX_PRIM_ROLE* hx_prim_roles(int32_t type) {
    switch (type) {
        case HX_PRIM_BUF:
        case HX_PRIM_CKBUF:
            return kBuf;
        case HX_PRIM_AND:
        case HX_PRIM_OR:
        case HX_PRIM_XOR:
            return kGate;
        case HX_PRIM_MUX:
            return kMux;
        case HX_PRIM_TRI:
            return kTri;
        case HX_PRIM_SFF:
            return kSff;
        case HX_PRIM_FF:
            return kFf;
        case HX_PRIM_LATCH:
            return kLatch;
        case HX_PRIM_PAD:
            return kPad;
        case HX_PRIM_ONE:
        case HX_PRIM_ZERO:
        case HX_PRIM_PULLUP:
        case HX_PRIM_PULLDOWN:
            return kSource;
        case HX_PRIM_RAM:
            return kRam;
        case HX_PRIM_RAMS:
            return kRams;
        case HX_PRIM_RAMD:
            return kRamd;
        case HX_PRIM_ROM:
            return kRom;
        default:
            return nullptr;
    }
}

bool hx_prim_takes_width(int32_t type) {
    const HX_PRIM_ROLE* roles = hx_prim_roles(type);
    for (; roles != nullptr && roles->role >= 0; ++roles) {
        if (roles->repeated) return true;
    }
    return false;
}

bool hx_prim_role_repeats(int32_t type, int32_t role) {
    const HX_PRIM_ROLE* roles = hx_prim_roles(type);
    for (; roles != nullptr && roles->role >= 0; ++roles) {
        if (roles->role == role) return roles->repeated;
    }
    return false;
}

uint32_t hx_prim_pin_count(int32_t type, uint16_t width) {
    const HX_PRIM_ROLE* roles = hx_prim_roles(type);
    if (roles == nullptr) return 0;
    bool needs_width = hx_prim_takes_width(type);
    if (needs_width && (width == 0 || width == HX_NO_INDEX)) return 0;
    uint32_t count = 0;
    for (; roles->role >= 0; ++roles)
        count += roles->repeated ? width : 1;
    return count <= 0xFFFF ? count : 0;
}

uint16_t hx_prim_pin_index(int32_t type, uint16_t width, int32_t role, uint16_t ordinal) {
    const HX_PRIM_ROLE* roles = hx_prim_roles(type);
    uint32_t index = 0;
    for (; roles != nullptr && roles->role >= 0; ++roles) {
        uint32_t run = roles->repeated ? width : 1;
        if (roles->role == role) {
            uint32_t n = ordinal == HX_NO_INDEX ? 0 : ordinal;
            return n < run ? static_cast<uint16_t>(index + n) : HX_NO_INDEX;
        }
        index += run;
    }
    return HX_NO_INDEX;
}

HX_PIN_TYPE hx_prim_pin_dir(int32_t type, int32_t role) {
    if (role == HX_PPIN_OUT) return type == HX_PRIM_TRI ? HX_PIN_TRI : HX_PIN_OUT;
    if (role == HX_PPIN_PAD) return HX_PIN_BI;
    return HX_PIN_IN;
}

const char* hx_prim_pin_name(int32_t role, uint16_t ordinal) {
    if (!valid_role(role)) return nullptr;
    if (ordinal == HX_NO_INDEX) return kRoleNames[role];
    // Names of repeated roles are made once per process and shared by every
    // primitive, so a million gates cost no name storage of their own.
    static std::unordered_map<uint32_t, std::unique_ptr<char[]>> names;
    uint32_t key = static_cast<uint32_t>(role) << 16 | ordinal;
    auto [it, made] = names.try_emplace(key);
    if (made) {
        char text[16];
        int length = std::snprintf(text, sizeof text, "%s%u", kRoleNames[role], ordinal);
        it->second = std::make_unique<char[]>(static_cast<std::size_t>(length) + 1);
        std::memcpy(it->second.get(), text, static_cast<std::size_t>(length) + 1);
    }
    return it->second.get();
}
