// Builds a small design through the database API and stores it as a design
// file: a counter bit with a flip-flop, its next value from an XOR, a
// global clock, a sub-block and a pad, mapped onto a physical block.
//
//   make_design OUTPUT.hxb
#include <cstdio>

#include "hx_library.h"
#include "port_file.h"
#include "ut_ptrfile.h"

namespace {

void connect(HX_DESIGN* d, HX_SIGNAL* s, HX_BLOCK* b, uint16_t pin) {
    d->create_conn(s, b, pin);
}

HX_DESIGN* build() {
    HX_LIBRARY* lib = hx_env.create_library("example", 0);
    HX_DESIGN* d = lib->create_design("counter");
    d->create_prop("AUTHOR", "example", 1);

    HX_LOGBLOCK* top = d->create_logblock(nullptr, 2, "counter");
    top->get_pin(0)->set_name("clk");
    top->get_pin(0)->set_dir(HX_PIN_IN);
    top->get_pin(1)->set_name("q");
    top->get_pin(1)->set_dir(HX_PIN_OUT);

    HX_SIGNAL* clk = d->create_global_signal("clk");
    HX_SIGNAL* q = d->create_signal(top, "q");
    HX_SIGNAL* d_in = d->create_signal(top, "d");
    q->create_prop("LOC", "P4", 1);
    connect(d, clk, top, 0);
    connect(d, q, top, 1);

    // The bit: q toggles on every clock.
    HX_LOGPRIM* ff = d->create_logprim(top, HX_PRIM_FF, HX_NO_INDEX, "bit");
    HX_PRIMITIVE* ffp = ff->get_primitive();
    connect(d, d_in, ff, ffp->get_prim_index(HX_PPIN_IN, 0));
    connect(d, clk, ff, ffp->get_prim_index(HX_PPIN_CLK, 0));
    connect(d, q, ff, ffp->get_prim_index(HX_PPIN_OUT, 0));

    // The next value sits in a block of its own: d = q XOR 1.
    HX_LOGBLOCK* next = d->create_logblock(top, 2, "next");
    next->get_pin(0)->set_name("a");
    next->get_pin(0)->set_dir(HX_PIN_IN);
    next->get_pin(1)->set_name("y");
    next->get_pin(1)->set_dir(HX_PIN_OUT);
    connect(d, q, next, 0);
    connect(d, d_in, next, 1);
    HX_SIGNAL* a = d->create_signal(next, "a");
    HX_SIGNAL* y = d->create_signal(next, "y");
    HX_SIGNAL* one = d->create_signal(next, "one");
    connect(d, a, next, 0);
    connect(d, y, next, 1);
    HX_LOGPRIM* vcc = d->create_logprim(next, HX_PRIM_ONE, HX_NO_INDEX, "vcc");
    connect(d, one, vcc, 0);
    HX_LOGPRIM* x = d->create_logprim(next, HX_PRIM_XOR, 2, "x");
    connect(d, a, x, 0);
    connect(d, one, x, 1);
    connect(d, y, x, 2);

    // The physical side: a site that holds the flip-flop.
    HX_PHYSBLOCK* chip = d->create_physblock(nullptr, 1, "chip");
    chip->get_pin(0)->set_name("P4");
    chip->get_pin(0)->set_dir(HX_PIN_OUT);
    HX_PHYSBLOCK* site = d->create_physblock(chip, 1, "site0");
    site->get_pin(0)->set_name("Q");
    d->set_block_phys_parent(ff, site);
    // The output pad carries q.
    HX_MAPSIGNAL* pad = chip->create_map_signal(0, "pad_q");
    pad->create_prop("IOSTANDARD", "LVCMOS33", 1);
    pad->create_mapconn(top, 1);
    return d;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: make_design OUTPUT.hxb\n");
        return 64;
    }
    HX_DESIGN* design = build();
    UT_PTRFILE file(Port::ACCESS_WRITE);
    if (Port::File::open(argv[1], &file, false) == nullptr) return 1;
    const bool written = hx_env.write_design(&file, design);
    return Port::File::close(&file) && written ? 0 : 1;
}
