// library.vrx: a small cell library, read as a whole with
//   vrx2hxb -l library.vrx        (all designs, as the library library.hxl)
//   hxb2vrx library.hxl out.vrx   (and back to text, aliases included)
//
// Each DESIGN is a cell; a cell may use an earlier one by naming it (or one
// of its aliases) as a block label, which grafts a copy of it into the cell.

// The library's own properties. CASESENSE: names differ by letter case.
(CASESENSE LIBRARY_KIND=cells VERSION=1.2)

// Half adder: s = a xor b, c = a and b.
DESIGN half_adder (AREA=2 DESCRIPTION="half adder") {
   BLOCK half_adder 4 {
      PIN a (TYPE=IN CONN=a)
      PIN b (TYPE=IN CONN=b)
      PIN s (TYPE=OUT CONN=s)
      PIN c (TYPE=OUT CONN=c)
   }
   PRIM XOR 2 (NAME=x) {
      PIN IN (CONN=a)
      PIN IN (CONN=b)
      PIN OUT (CONN=s MAXDELAY=:120ps)
   }
   PRIM AND 2 (NAME=n) {
      PIN IN (CONN=a)
      PIN IN (CONN=b)
      PIN OUT (CONN=c MAXDELAY=:80ps)
   }
}
// Aliases: the design, then its second name. HA is used right below.
DESIGN half_adder HA { }

// Full adder from two half adders (grafted by name and by alias).
DESIGN full_adder (AREA=5 DESCRIPTION="full adder") {
   BLOCK full_adder 5 {
      PIN a (TYPE=IN CONN=a)
      PIN b (TYPE=IN CONN=b)
      PIN ci (TYPE=IN CONN=ci)
      PIN s (TYPE=OUT CONN=s)
      PIN co (TYPE=OUT CONN=co)
   }
   BLOCK half_adder (NAME=h1) {
      PIN a (CONN=a)
      PIN b (CONN=b)
      PIN s (CONN=p)
      PIN c (CONN=g)
   }
   BLOCK HA (NAME=h2) {
      PIN a (CONN=p)
      PIN b (CONN=ci)
      PIN s (CONN=s)
      PIN c (CONN=t)
   }
   PRIM OR 2 (NAME=carry) {
      PIN IN (CONN=g)
      PIN IN (CONN=t)
      PIN OUT (CONN=co)
   }
   // p is the propagate net: it also runs into h2, where it is called a.
   SIGNAL p (SIG_ALIAS=propagate)
   SIGNAL t (RECOVERED_NAME=carry_t)
}

// Four-to-one multiplexer from three two-to-one ones.
DESIGN mux4 (AREA=3) {
   BLOCK mux4 7 {
      PIN d0 (TYPE=IN CONN=d0)
      PIN d1 (TYPE=IN CONN=d1)
      PIN d2 (TYPE=IN CONN=d2)
      PIN d3 (TYPE=IN CONN=d3)
      PIN s0 (TYPE=IN CONN=s0)
      PIN s1 (TYPE=IN CONN=s1)
      PIN y (TYPE=OUT CONN=y)
   }
   PRIM MUX (NAME=m0) {
      PIN INA (CONN=d0)
      PIN INB (CONN=d1)
      PIN SEL (CONN=s0)
      PIN OUT (CONN=n0)
   }
   PRIM MUX (NAME=m1) {
      PIN INA (CONN=d2)
      PIN INB (CONN=d3)
      PIN SEL (CONN=s0)
      PIN OUT (CONN=n1)
   }
   PRIM MUX (NAME=m2) {
      PIN INA (CONN=n0)
      PIN INB (CONN=n1)
      PIN SEL (CONN=s1)
      PIN OUT (CONN=y)
   }
   SIGNAL s0 (FANOUT=2)
}

// A register bit with clock enable and synchronous clear (SFF: the
// flip-flop with synchronous set and reset pins as well).
DESIGN sync_reg (AREA=4) {
   BLOCK sync_reg 5 {
      PIN d (TYPE=IN CONN=d)
      PIN clk (TYPE=IN CONN=clk)
      PIN en (TYPE=IN CONN=en)
      PIN clr (TYPE=IN CONN=clr)
      PIN q (TYPE=OUT CONN=q)
   }
   PRIM SFF (NAME=ff INIT=@0) {
      PIN IN (CONN=d SETUP=:40ps HOLD=10:20ps SETUPREF=CLK,R)
      PIN CLK (CONN=clk)
      PIN CE (CONN=en)
      PIN SET (UNUSED)
      PIN RST (UNUSED)
      PIN SSET (UNUSED)
      PIN SRST (CONN=clr)
      PIN OUT (CONN=q CLK2OUT=50:90ps CLKREF=CLK,R)
   }
   SIGNAL clk (PERIOD=2ns)
}

// A transparent-low latch: the gate input is inverted.
DESIGN latch_n (AREA=3) {
   BLOCK latch_n 3 {
      PIN d (TYPE=IN CONN=d)
      PIN gn (TYPE=IN CONN=gn)
      PIN q (TYPE=OUT CONN=q)
   }
   PRIM LATCH (NAME=l) {
      PIN IN (CONN=d)
      PIN CTL (INV CONN=gn)
      PIN SET (UNUSED)
      PIN RST (UNUSED)
      PIN OUT (CONN=q)
   }
}

// A 4x1 dual-port memory: write address WADR, read address RADR, both
// two bits wide (the width of RAMD).
DESIGN dpram4 (AREA=8) {
   BLOCK dpram4 8 {
      PIN din (TYPE=IN CONN=din)
      PIN wa0 (TYPE=IN CONN=wa0)
      PIN wa1 (TYPE=IN CONN=wa1)
      PIN ra0 (TYPE=IN CONN=ra0)
      PIN ra1 (TYPE=IN CONN=ra1)
      PIN clk (TYPE=IN CONN=clk)
      PIN we (TYPE=IN CONN=we)
      PIN dout (TYPE=OUT CONN=dout)
   }
   PRIM RAMD 2 (NAME=mem INIT=@0x0) {
      PIN IN (CONN=din)
      PIN WADR (CONN=wa0)
      PIN WADR (CONN=wa1)
      PIN RADR (CONN=ra0)
      PIN RADR (CONN=ra1)
      PIN CLK (CONN=clk)
      PIN CE (CONN=we)
      PIN OUT (CONN=dout)
   }
}

// A bidirectional I/O cell: a three-state driver and an input buffer on a
// pad, held high by a pull-up when nothing drives it.
DESIGN io_cell (AREA=6) {
   BLOCK io_cell 4 {
      PIN o (TYPE=IN CONN=o)
      PIN oe (TYPE=IN CONN=oe)
      PIN i (TYPE=OUT CONN=i)
      PIN pad (TYPE=BI CONN=pad)
   }
   PRIM TRI (NAME=drv) {
      PIN IN (CONN=o)
      PIN CTL (CONN=oe)
      PIN OUT (CONN=pad DRIVE=12)
   }
   PRIM PAD (NAME=bond) {
      PIN PAD (CONN=pad CAP=1.500000)
   }
   PRIM BUF (NAME=rcv) {
      PIN IN (CONN=pad)
      PIN OUT (CONN=i)
   }
   PRIM PULLUP (NAME=pu) {
      PIN OUT (CONN=pad)
   }
}

// More aliases. A name with a blank (or a keyword) goes in double quotes.
DESIGN full_adder FA { }
DESIGN mux4 "mux 4:1" { }
DESIGN sync_reg DFFE { }
DESIGN io_cell "BLOCK" { }
