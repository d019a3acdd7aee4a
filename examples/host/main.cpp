// vrx_example: how a host program embeds the converter.
//
//   vrx_example INPUT.vrx OUTDIR
//
// Reads the text netlist INPUT.vrx as a design (the last design it defines;
// reading ends with the design-rule check), stores it as OUTDIR/NAME.hxb,
// reads that file back with a fresh converter and writes it as the text
// OUTDIR/NAME.vrx, NAME being INPUT's file name without its extension. Then
// prints one summary line. The converter reports its progress and findings
// itself (status lines on standard output, the rest on standard error); a
// step that fails is named on standard error, and the exit status is then
// the converter's VX_STATUS (1 file, 2 parse, 3 design-rule errors).
#include <cstdio>
#include <string>

#include "vrx.h"

namespace {

struct Counts {
    unsigned blocks = 0;
    unsigned primitives = 0;
    unsigned long pins = 0;
};

// Every block of the design, roots and primitives included, in creation order.
Counts count(const HX_DESIGN& design) {
    Counts counts;
    UT_BLIST_ITER<HX_BLOCK>* blocks = design.create_block_iter();
    while (const HX_BLOCK* block = blocks->l_next()) {
        ++(block->is_primitive() ? counts.primitives : counts.blocks);
        counts.pins += block->get_pin_count();
    }
    design.delete_block_iter(blocks);
    return counts;
}

int failed(const char* step, const std::string& path, VX_STATUS status) {
    std::fprintf(stderr, "vrx_example: %s %s failed (status %d)\n", step, path.c_str(),
                 static_cast<int>(status));
    return static_cast<int>(status);
}

std::string stem(const std::string& path) {
    const std::size_t slash = path.find_last_of('/');
    const std::string name = slash == std::string::npos ? path : path.substr(slash + 1);
    const std::size_t dot = name.find_last_of('.');
    return dot == std::string::npos || dot == 0 ? name : name.substr(0, dot);
}

// Text to database file. Only one converter may exist at a time, so each
// direction has its own, gone before the next is made. What a converter read
// belongs to the database environment (hx_env) and outlives it; this host
// frees it when done with it.
int text_to_database(const std::string& input, const std::string& hxb) {
    HX_LIBRARY* library = nullptr;
    VX_STATUS status = VX_OK;
    {
        VRX vrx;
        status = vrx.vrx_read(input.c_str(), /*is_design=*/1, /*make_physroot=*/0, /*nograft=*/0);
        if (status == VX_OK) status = vrx.hxb_write(hxb.c_str());
        library = vrx.get_library();
    }
    if (library != nullptr) hx_env.delete_library(library);
    return status == VX_OK ? 0 : failed("converting", input, status);
}

// Database file to text; prints the summary from the design read back.
int database_to_text(const std::string& hxb, const std::string& text) {
    const HX_DESIGN* design = nullptr;
    VX_STATUS status = VX_OK;
    {
        VRX vrx;
        status = vrx.hxb_read(hxb.c_str());
        if (status != VX_OK) return failed("reading", hxb, status);
        status = vrx.vrx_write(text.c_str(), /*filter_file=*/nullptr, /*omit_user=*/0);
        design = vrx.get_design();
    }
    if (status != VX_OK) return failed("writing", text, status);
    const Counts counts = count(*design);
    std::printf("vrx_example: design %s: %u blocks, %u primitives, %lu pins -> %s, %s\n",
                design->get_name(), counts.blocks, counts.primitives, counts.pins, hxb.c_str(),
                text.c_str());
    hx_env.delete_library(design->get_library());
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fprintf(stderr, "usage: vrx_example INPUT.vrx OUTDIR\n");
        return 64;
    }
    const std::string base = std::string(argv[2]) + "/" + stem(argv[1]);
    const int status = text_to_database(argv[1], base + ".hxb");
    return status != 0 ? status : database_to_text(base + ".hxb", base + ".vrx");
}
