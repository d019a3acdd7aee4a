// design.vrx: a two-bit accumulator with three-state outputs, written as a
// tour of the VRX text netlist format.
//
// Reading rules in brief. "//" starts a comment where a token may start.
// Words end at a blank, a line end, a quote or one of ( ) { } =; a name that
// holds one of those, or is one of the ten statement keywords (DESIGN, BLOCK,
// PHYSBLOCK, PRIM, PHYSPRIM, PIN, SIGNAL, PHYSSIGNAL, MAPSIGNAL, MAPCONN), is
// written in double quotes. Property lists are "(" NAME or NAME=VALUE ... ")".
//
// Convert it with
//   vrx2hxb design.vrx            (the last design, accum, as design.hxb)
//   vrx2hxb -l design.vrx         (every design, as the library design.hxl)
//   hxb2vrx design.hxb out.vrx    (and back to text)

// Library properties: an optional list before the first DESIGN. CASESENSE
// makes the library's names case-sensitive; LOG_PM names the device (its
// description qx10.acd is on the device path) that an empty PHYSICAL flag on
// a block refers to; any other name is an ordinary library property.
(CASESENSE LOG_PM=qx10 PROJECT=vrx_tour)

// ---------------------------------------------------------------------------
// A one-bit full adder. Each design is a DESIGN statement: its name, its own
// properties, and in braces its blocks, then its signals, then its map
// signals, in that order.
DESIGN full_adder (AUTHOR=examples DESCRIPTION="one-bit full adder") {
   // The first BLOCK is the design's logical root. It is named after the
   // design whatever its label, and it needs its pin count. Its PIN
   // statements name the pins in order; CONN names the net inside the block.
   BLOCK full_adder 5 {
      PIN a (TYPE=IN CONN=a)
      PIN b (TYPE=IN CONN=b)
      PIN ci (TYPE=IN CONN=ci)
      PIN s (TYPE=OUT CONN=s)
      PIN co (TYPE=OUT CONN=co)
   }
   // Primitives: PRIM, the type, a width for the types with a repeated pin
   // role (AND, OR, XOR: their inputs), and the pins by role. A repeated
   // role takes its pins in statement order: IN0, IN1, ... A primitive gets
   // its instance name from NAME.
   PRIM XOR 2 (NAME=x1) {
      PIN IN (CONN=a)
      PIN IN (CONN=b)
      PIN OUT (CONN=p)
   }
   PRIM XOR 2 (NAME=x2) {
      PIN IN (CONN=p)
      PIN IN (CONN=ci)
      PIN OUT (CONN=s)
   }
   PRIM AND 2 (NAME=g1) {
      PIN IN (CONN=a)
      PIN IN (CONN=b)
      PIN OUT (CONN=g)
   }
   PRIM AND 2 (NAME=g2) {
      PIN IN (CONN=p)
      PIN IN (CONN=ci)
      PIN OUT (CONN=t)
   }
   PRIM OR 2 (NAME=o1) {
      PIN IN (CONN=g)
      PIN IN (CONN=t)
      PIN OUT (CONN=co)
   }
   // Signal statements carry what pins cannot: properties. SIG_ALIAS,
   // USER_ALIAS and RECOVERED_NAME belong to the signal itself; every other
   // property belongs to the signal's network (the net across the hierarchy).
   SIGNAL p (SIG_ALIAS=propagate KEEP)
}

// An alias: DESIGN, an existing design's name, a second name, and empty
// braces. From here on "fa" names full_adder too.
DESIGN full_adder fa { }

// ---------------------------------------------------------------------------
// The accumulator: q <= q + d on each clock while en is high, q driving
// the three-state outputs y0 and y1 while oe is high. ovf is the sum's
// carry out; flag is ovf while en is high, else "q shows all ones".
DESIGN accum (AUTHOR=examples REVISION=3) {
   BLOCK accum 9 {
      PIN clk (TYPE=IN CONN=clk)
      PIN en (TYPE=IN CONN=en)
      PIN d0 (TYPE=IN CONN=d0)
      PIN d1 (TYPE=IN CONN=d1)
      PIN oe (TYPE=IN CONN=oe)
      PIN y0 (TYPE=TRI CONN=y0)
      PIN y1 (TYPE=TRI CONN=y1)
      PIN flag (TYPE=OUT CONN=flag)
      PIN ovf (TYPE=OUT CONN=c1)
   }

   // Grafted instances: a BLOCK whose label names another design of the
   // library (here by its name, then by its alias) becomes a copy of that
   // design. Its pins are found by name; TYPE is the design's own and is not
   // written here. A block property such as USER (a user-made block) or
   // CRITICAL applies to the instance.
   BLOCK full_adder (NAME=add0 USER) {
      PIN a (CONN=q0)
      PIN b (CONN=d0)
      PIN ci (CONN=cin)
      PIN s (CONN=s0)
      PIN co (CONN=c0)
   }
   BLOCK fa (NAME=add1 USER CRITICAL) {
      PIN a (CONN=q1)
      PIN b (CONN=d1)
      PIN ci (CONN=c0)
      PIN s (CONN=s1)
      PIN co (CONN=c1)
   }

   // A template block: a label that names no design, with a pin count,
   // makes a block of that many pins whose contents are not known here (a
   // black box). The empty PHYSICAL flag becomes PHYSICAL=<LOG_PM device>.
   BLOCK probe 3 (NAME=dbg PHYSICAL PURPOSE="debug tap") {
      PIN i0 (TYPE=IN CONN=q0 LOAD=0.250000)
      PIN i1 (TYPE=IN CONN=q1 LOAD=0.250000)
      PIN code (TYPE=IN CONN=code)
   }

   // Primitives of other kinds. Roles a primitive has but the netlist does
   // not use carry UNUSED; INV inverts a primitive pin; NAME renames it.
   PRIM ZERO (NAME=tie0) {
      PIN OUT (CONN=cin)
   }
   PRIM CKBUF (NAME=ckb) {
      PIN IN (CONN=clk)
      PIN OUT (CONN=clk_b FANOUT=2)
   }
   // Flip-flops with timing: SETUP and CLK2OUT are timing values
   // (MIN:MAX and a unit), SETUPREF and CLKREF point at a pin of the same
   // primitive (PIN, edge R or F, optional timing). A pin reference comes
   // last among a pin's properties. INIT=@0 is a parameter (the text after
   // "@"). gsr_n, a global signal, resets both (RST is active high, so it
   // is inverted).
   PRIM FF (NAME=r0 INIT=@0) {
      PIN IN (CONN=s0 SETUP=:1ns SETUPREF=CLK,R)
      PIN CLK (CONN=clk_b)
      PIN CE (CONN=en)
      PIN SET (UNUSED)
      PIN RST (INV CONN=gsr_n)
      PIN OUT (CONN=q0 CLK2OUT=1:3ns CLKREF=CLK,R)
   }
   // MAPINV on a pin flips the inversion of the pin's map connection (the
   // MAPSIGNAL groups below); the writer shows it on the MAPCONN line.
   PRIM FF (NAME=r1 INIT=@0) {
      PIN IN (CONN=s1 SETUP=:1ns SETUPREF=CLK,R)
      PIN CLK (CONN=clk_b)
      PIN CE (CONN=en)
      PIN SET (UNUSED)
      PIN RST (INV CONN=gsr_n)
      PIN OUT (MAPINV CONN=q1 CLK2OUT=1:3ns CLKREF=CLK,R)
   }
   PRIM TRI (NAME=t0) {
      PIN IN (CONN=q0)
      PIN CTL (CONN=oe)
      PIN OUT (CONN=y0 DRIVE=8 IOSTANDARD=LVCMOS33)
   }
   PRIM TRI (NAME=t1) {
      PIN IN (CONN=q1)
      PIN CTL (CONN=oe)
      PIN OUT (CONN=y1 DRIVE=8 IOSTANDARD=LVCMOS33)
   }
   // A three-input AND ("q shows all ones") and a multiplexer (INB when SEL
   // is high) make flag.
   PRIM AND 3 (NAME=all1) {
      PIN IN (CONN=q0)
      PIN IN (CONN=q1)
      PIN IN (CONN=oe)
      PIN OUT (CONN=full)
   }
   PRIM MUX (NAME=fsel) {
      PIN INA (CONN=full)
      PIN INB (CONN=c1)
      PIN SEL (CONN=en)
      PIN OUT (CONN=flag)
   }
   // A read-only memory with a two-bit address; its pins get names of
   // their own (the defaults would be ADR0, ADR1).
   PRIM ROM 2 (NAME=gray INIT=@0x2310) {
      PIN ADR (NAME=A0 CONN=q0)
      PIN ADR (NAME=A1 CONN=q1)
      PIN OUT (CONN=code)
   }

   // The physical side. The first PHYSBLOCK is the physical root (named
   // after the design, like the logical root); PHYSBLOCK and PHYSPRIM
   // statements after it are its children. Physical nets are apart from
   // logical ones even where the names agree.
   PHYSBLOCK accum 3 {
      PIN P1 (TYPE=IN CONN=pad_clk)
      PIN P7 (TYPE=BI CONN=pad_y0)
      PIN P8 (TYPE=BI CONN=pad_y1)
   }
   PHYSBLOCK iob 2 (NAME=IOB_CLK LOC=P1) {
      PIN PAD (TYPE=BI CONN=pad_clk)
      PIN I (TYPE=OUT CONN=gclk)
   }
   PHYSBLOCK slice 3 (NAME=SLICE_0 LOC=R1C1) {
      PIN CLK (TYPE=IN CONN=gclk)
      PIN X (TYPE=OUT CONN=sx)
      PIN Y (TYPE=OUT CONN=sy)
   }
   PHYSBLOCK iob 2 (NAME=IOB_Y0 LOC=P7) {
      PIN O (TYPE=IN CONN=sx)
      PIN PAD (TYPE=BI CONN=pad_y0)
   }
   PHYSBLOCK iob 2 (NAME=IOB_Y1 LOC=P8) {
      PIN O (TYPE=IN CONN=sy)
      PIN PAD (TYPE=BI CONN=pad_y1)
   }
   PHYSPRIM PULLUP (NAME=keep_y0) {
      PIN OUT (CONN=pad_y0)
   }

   // Logical signals. GLOBAL makes a signal global: it belongs to no block
   // and is driven from outside the design.
   SIGNAL gsr_n (GLOBAL)
   SIGNAL clk_b (USER_ALIAS=clock MAXSKEW=100ps)
   // A name with "/" is a hierarchical net name: the carry generate net g
   // inside the grafted add1. (A net that leaves a block through a pin is
   // one net with the outer one and goes by the outer name.)
   SIGNAL accum/add1/g (CRITICAL)
   // Merge records name another net by its full hierarchical name (the
   // root's name first: accum/full is the net full of this design), which
   // may come later in the file. flag was merged from full, and the ROM's
   // output was joined with it.
   SIGNAL flag (MERGEDFROM=accum/full)
   SIGNAL code (JOINED=accum/full)
   // Physical signals.
   PHYSSIGNAL gclk (PERIOD=10ns)
   PHYSSIGNAL pad_y0 (SLEW=SLOW)

   // Map signals tie logical blocks to physical ones. MAPSIGNAL names a
   // physical block and one of its pins (making a map signal there, with
   // properties and an optional NAME); each MAPCONN names a logical block
   // and its pin that map to it, and makes that physical block the logical
   // block's physical parent; (MAPINV) marks the mapping inverted. Blocks
   // are named by hierarchical name. MAPSIGNAL with only a block name sets
   // the physical parent of the MAPCONN blocks, pin-less.
   MAPSIGNAL accum P1 (NAME=clk_pad) {
      MAPCONN accum clk
   }
   MAPSIGNAL accum/SLICE_0 X {
      MAPCONN accum/r0 OUT
   }
   MAPSIGNAL accum/SLICE_0 Y (NAME=q1_out) {
      MAPCONN accum/r1 OUT
   }
   MAPSIGNAL accum/SLICE_0 {
      MAPCONN accum/ckb
   }
   MAPSIGNAL accum/IOB_Y0 PAD (NAME=y0_pad) {
      MAPCONN accum/t0 OUT
   }
   MAPSIGNAL accum/IOB_Y1 PAD (NAME=y1_pad) {
      MAPCONN accum/t1 OUT (MAPINV)
   }
}
