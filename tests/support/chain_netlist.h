// A text netlist of `gates` AND gates in a chain from input a to output y,
// about 80 bytes of text a gate: big enough, at a few thousand gates, for
// many scanner blocks and several chunks of every conversion.
#pragma once

#include <string>

namespace vrx_test {

inline std::string chain_netlist(int gates) {
    std::string text =
        "DESIGN chain {\n   BLOCK chain 2 (NAME=chain) {\n"
        "      PIN a (TYPE=IN CONN=n0)\n";
    text += "      PIN y (TYPE=OUT CONN=n" + std::to_string(gates) + ")\n   }\n";
    for (int i = 0; i < gates; ++i) {
        text += "   PRIM AND 2 { PIN IN (CONN=n" + std::to_string(i) + ") PIN IN (CONN=n0) ";
        text += "PIN OUT (CONN=n" + std::to_string(i + 1) + ") }\n";
    }
    return text + "}\n";
}

}  // namespace vrx_test
