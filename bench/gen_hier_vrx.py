#!/usr/bin/env python3
"""Generate a synthetic, seeded HIERARCHICAL netlist as VRX text.

    gen_hier_vrx.py --prims 1000000 [--seed 1] [-o OUT] [--stats]

The netlist holds, in this order:
  * leaf designs (leaf<k>): 120 to 280 primitives each (AND, OR, XOR, MUX,
    BUF, FF, one ZERO tie-off), pins i<j> / o<j>; flip-flops clocked by the
    global signal gclk; some pins carry timing and pin-reference properties;
    a few leaves get a second name (DESIGN leaf<k> cell<k> { });
  * mid designs of two tiers: ma<k> instantiate 3 to 5 leaves, mb<k>
    instantiate 2 to 4 ma designs and 1 to 3 leaves; both add glue logic of
    their own. An instance is a BLOCK statement whose label names an earlier
    design, so the reader grafts a copy of that design;
  * region designs (reg<k>): a physical root and 6 to 10 physical tiles;
  * the top design "top", the last one: inputs and outputs, instances of
    mb, ma and leaf designs filling the primitive budget, 20% of the
    primitives as its own glue logic, a physical root with region instances,
    SIGNAL statements on its own nets and on nets deep inside instances
    ("top/b3/a1/u2/n17") carrying properties and MERGEDTO / MERGEDFROM /
    JOINED merge records that name other nets, the global signals gclk, grst
    and gscan, PHYSSIGNAL statements, and MAPSIGNAL groups whose MAPCONN
    statements map top-level and nested logical blocks and their pins onto
    the tiles of the region instances.

--prims is the total primitive count of the top design, grafted copies
included; the result has exactly that many. Every part grows in proportion
to it (design counts, instance counts, top pins, signal and map statements),
so sizes differ only in scale: the number of leaf designs is prims/10000, of
ma designs prims/20000, of mb and region designs prims/50000. Every net has
one driver, every primitive pin a connection and every merge record a net to
name, so the netlist reads without a warning and passes the design-rule
check. Lines end in CR LF, indentation is 3 spaces.
Python 3 standard library only; the same arguments always give the same bytes.
"""

import argparse
import random
import sys

CRLF = "\r\n"
IND1 = "   "
IND2 = "      "

# Kinds of glue gates and their weights: (keyword, width, input roles).
GATES = (
    ("AND", 2, ("IN", "IN")),
    ("OR", 2, ("IN", "IN")),
    ("XOR", 2, ("IN", "IN")),
    ("AND", 3, ("IN", "IN", "IN")),
    ("MUX", None, ("INA", "INB", "SEL")),
    ("BUF", None, ("IN",)),
    ("FF", None, None),
)
GATE_WEIGHTS = (35, 15, 10, 8, 8, 6, 18)


class Design:
    """What later designs need to know of a design: its name, its pins, its
    primitive count with nested instances, and where its internal nets are."""

    def __init__(self, name, inputs, outputs):
        self.name = name
        self.label = name        # the name instances use (may be an alias)
        self.inputs = inputs     # pin names
        self.outputs = outputs
        self.prims = 0           # with the contents of its instances
        self.internal = []       # own nets connected to no pin of the root
        self.instances = []      # (instance name, Design)


class Body:
    """The statements of one design being generated, and its driven nets."""

    def __init__(self, rng):
        self.rng = rng
        self.lines = []
        self.driven = []         # nets with a driver, in the order made
        self.own_prims = 0
        self.gate_outputs = []

    def line(self, indent, text):
        self.lines.append(indent + text + CRLF)

    def pick_net(self):
        """A driven net, mostly a recent one."""
        rng = self.rng
        n = len(self.driven)
        if rng.random() < 0.75:
            d = 1 + int(rng.expovariate(1.0 / 12.0))
            if d <= n:
                return self.driven[n - d]
        return self.driven[rng.randrange(n)]

    def distinct_nets(self, count, exclude=()):
        """`count` different driven nets, none of them in `exclude`."""
        nets = []
        while len(nets) < count:
            net = self.pick_net()
            if net not in nets and net not in exclude:
                nets.append(net)
        return nets

    def gate(self, index, tie, clock, reset, enable):
        """One glue primitive g<index> (or f<index> for a flip-flop), its
        output the new net n<index>."""
        rng = self.rng
        kind, width, roles = rng.choices(GATES, GATE_WEIGHTS)[0]
        out = "n%d" % index
        if kind == "FF":
            self.line(IND1, "PRIM FF (NAME=f%d) {" % index)
            setup = " SETUP=1:2ns" if rng.random() < 0.05 else ""
            self.line(IND2, "PIN IN (NAME=IN%s CONN=%s)" % (setup, self.pick_net()))
            self.line(IND2, "PIN CLK (NAME=CLK CONN=%s)" % clock)
            self.line(IND2, "PIN CE (NAME=CE CONN=%s)" % enable)
            self.line(IND2, "PIN SET (NAME=SET CONN=%s)" % tie)
            self.line(IND2, "PIN RST (NAME=RST CONN=%s)" % reset)
            ref = " CLKREF=CLK,R" if rng.random() < 0.05 else ""
            self.line(IND2, "PIN OUT (NAME=OUT%s CONN=%s)" % (ref, out))
        else:
            head = "PRIM %s %d" % (kind, width) if width else "PRIM " + kind
            self.line(IND1, "%s (NAME=g%d) {" % (head, index))
            nets = self.distinct_nets(len(roles))
            for k, (role, net) in enumerate(zip(roles, nets)):
                pin = "IN%d" % k if role == "IN" else role
                inv = " INV" if rng.random() < 0.3 else ""
                self.line(IND2, "PIN %s (NAME=%s%s CONN=%s)" % (role, pin, inv, net))
            self.line(IND2, "PIN OUT (NAME=OUT CONN=%s)" % out)
        self.line(IND1, "}")
        self.own_prims += 1
        self.driven.append(out)
        self.gate_outputs.append(out)

    def tie_off(self):
        self.line(IND1, "PRIM ZERO (NAME=z0) {")
        self.line(IND2, "PIN OUT (NAME=OUT CONN=zero)")
        self.line(IND1, "}")
        self.own_prims += 1

    def instance(self, name, child, props=""):
        """A grafted copy of `child`; its outputs drive new nets <name>_<pin>."""
        self.line(IND1, "BLOCK %s (NAME=%s%s) {" % (child.label, name, props))
        for pin, net in zip(child.inputs, self.distinct_nets(len(child.inputs))):
            self.line(IND2, "PIN %s (CONN=%s)" % (pin, net))
        outs = []
        for pin in child.outputs:
            net = "%s_%s" % (name, pin)
            self.line(IND2, "PIN %s (CONN=%s)" % (pin, net))
            outs.append(net)
        self.line(IND1, "}")
        self.driven.extend(outs)
        return outs


def root_block(body, name, inputs, outputs, out_nets, props=""):
    body.line(IND1, "BLOCK %s %d (NAME=%s%s) {" % (name, len(inputs) + len(outputs), name, props))
    for pin in inputs:
        body.line(IND2, "PIN %s (TYPE=IN CONN=%s)" % (pin, pin))
    for pin, net in zip(outputs, out_nets):
        body.line(IND2, "PIN %s (TYPE=OUT CONN=%s)" % (pin, net))
    body.line(IND1, "}")


def pin_names(prefix, count):
    return ["%s%d" % (prefix, j) for j in range(count)]


def finish(design, body, out_nets, sub_prims):
    """Records the design's size and its nets that no root pin reaches."""
    on_pins = set(out_nets)
    design.prims = body.own_prims + sub_prims
    design.internal = [n for n in body.driven if n not in on_pins and n not in design.inputs]


def design_text(name, body_lines, head_props=""):
    return ["DESIGN %s%s {%s" % (name, head_props, CRLF)] + body_lines + ["}" + CRLF]


def signal_lines(body, rng, nets, share):
    """SIGNAL statements with properties on a share of the design's own nets."""
    for net in nets:
        if rng.random() < share:
            prop = rng.choice(("DRIVE=%d" % rng.randint(1, 8), "LOAD=0.%d" % rng.randint(1, 9),
                               "KEEP", "CRIT=high"))
            body.line(IND1, "SIGNAL %s (%s)" % (net, prop))


def make_leaf(seed, k):
    rng = random.Random("%d:leaf:%d" % (seed, k))
    name = "leaf%d" % k
    inputs = pin_names("i", rng.randint(8, 16))
    outputs = pin_names("o", rng.randint(4, 8))
    gates = rng.randint(120, 280)
    design = Design(name, inputs, outputs)
    body = Body(rng)
    body.driven.extend(inputs)
    body.tie_off()
    for g in range(gates):
        body.gate(g, "zero", "gclk", inputs[0], inputs[1])
    out_nets = body.gate_outputs[-len(outputs):]
    head = Body(rng)
    root_block(head, name, inputs, outputs, out_nets, " AREA=%d" % gates)
    finish(design, body, out_nets, 0)
    body.line(IND1, "SIGNAL gclk (GLOBAL)")
    signal_lines(body, rng, design.internal, 0.02)
    text = design_text(name, head.lines + body.lines)
    if rng.random() < 0.2:
        design.label = "cell%d" % k
        text.append("DESIGN %s %s { }%s" % (name, design.label, CRLF))
    return design, text


def make_mid(seed, tier, k, children):
    """A mid design: instances of `children` (lists of designs to pick from,
    with counts) and glue logic of its own."""
    rng = random.Random("%d:%s:%d" % (seed, tier, k))
    name = "%s%d" % (tier, k)
    n_in, n_out, glue = {"ma": (20, 10, 100), "mb": (28, 14, 220)}[tier]
    inputs = pin_names("i", n_in + rng.randint(-4, 4))
    outputs = pin_names("o", n_out + rng.randint(-2, 2))
    design = Design(name, inputs, outputs)
    body = Body(rng)
    body.driven.extend(inputs)
    body.tie_off()
    sub_prims = 0
    for prefix, pool, low, high in children:
        for j in range(rng.randint(low, high)):
            child = rng.choice(pool)
            inst = "%s%d" % (prefix, j)
            body.instance(inst, child)
            design.instances.append((inst, child))
            sub_prims += child.prims
    for g in range(glue + rng.randint(-glue // 3, glue // 3)):
        body.gate(g, "zero", "gclk", inputs[0], inputs[1])
    out_nets = body.distinct_nets(len(outputs), set(inputs))
    head = Body(rng)
    root_block(head, name, inputs, outputs, out_nets)
    finish(design, body, out_nets, sub_prims)
    body.line(IND1, "SIGNAL gclk (GLOBAL)")
    signal_lines(body, rng, design.internal, 0.02)
    return design, design_text(name, head.lines + body.lines)


class Region:
    def __init__(self, name, inputs, tiles, internal):
        self.name = name
        self.inputs = inputs
        self.tiles = tiles        # tile names
        self.internal = internal  # physical nets inside the region


TILE_INS = 8
TILE_OUTS = 8


def make_region(seed, k):
    rng = random.Random("%d:reg:%d" % (seed, k))
    name = "reg%d" % k
    inputs = pin_names("x", 8)
    body = Body(rng)
    body.line(IND1, "PHYSBLOCK %s %d (NAME=%s) {" % (name, len(inputs), name))
    for pin in inputs:
        body.line(IND2, "PIN %s (TYPE=IN CONN=%s)" % (pin, pin))
    body.line(IND1, "}")
    body.driven.extend(inputs)
    tiles = []
    internal = []
    for t in range(rng.randint(6, 10)):
        tile = "t%d" % t
        body.line(IND1, "PHYSBLOCK tile %d (NAME=%s SITE=X%dY%d) {"
                  % (TILE_INS + TILE_OUTS, tile, t % 4, t // 4))
        for j, net in enumerate(body.distinct_nets(TILE_INS)):
            body.line(IND2, "PIN P%d (TYPE=IN CONN=%s)" % (j, net))
        outs = ["y%d_%d" % (t, j) for j in range(TILE_OUTS)]
        for j, net in enumerate(outs):
            body.line(IND2, "PIN P%d (TYPE=OUT CONN=%s)" % (TILE_INS + j, net))
        body.line(IND1, "}")
        body.driven.extend(outs)
        internal.extend(outs)
        tiles.append(tile)
    for net in internal:
        if rng.random() < 0.1:
            body.line(IND1, "PHYSSIGNAL %s (ROUTE=local)" % net)
    return Region(name, inputs, tiles, internal), design_text(name, body.lines)


def fill_instances(rng, budget, pools):
    """Instances (kind prefix, design) whose primitives add up to at most
    `budget`, drawn by weight; returns them and what is left."""
    chosen = []
    smallest = min(d.prims for _, pool, _ in pools for d in pool)
    while budget >= smallest:
        prefix, pool, _ = rng.choices(pools, [w for _, _, w in pools])[0]
        child = rng.choice(pool)
        if child.prims <= budget:
            chosen.append((prefix, child))
            budget -= child.prims
    return chosen, budget


def hier_net(rng, design, path):
    """A random net inside an instance of `design` named `path`, by the name
    of its network ("top/b3/a1/u2/n17")."""
    while design.instances and rng.random() < 0.6:
        inst, design = rng.choice(design.instances)
        path = path + "/" + inst
    if not design.internal:
        return None
    return path + "/" + rng.choice(design.internal)


def make_top(seed, prims, leaves, mas, mbs, regions):
    rng = random.Random("%d:top:%d" % (seed, prims))
    name = "top"
    n_pins = max(16, prims // 2000)
    inputs = pin_names("i", n_pins)
    outputs = pin_names("o", n_pins // 2)
    design = Design(name, inputs, outputs)
    body = Body(rng)
    body.driven.extend(inputs)

    glue = prims // 5
    pools = [("b", mbs, 60), ("a", mas, 25), ("u", leaves, 15)]
    chosen, left = fill_instances(rng, prims - glue - 1, pools)
    glue += left
    counters = {}
    top_blocks = []       # hierarchical names of top-level logical blocks
    for prefix, child in chosen:
        j = counters.get(prefix, 0)
        counters[prefix] = j + 1
        inst = "%s%d" % (prefix, j)
        props = " LOC=R%dC%d" % (rng.randrange(64), rng.randrange(64)) if rng.random() < 0.3 else ""
        body.instance(inst, child, props)
        design.instances.append((inst, child))
        top_blocks.append(("top/" + inst, child))
    body.tie_off()
    for g in range(glue):
        body.gate(g, "zero", "gclk", "grst", "gscan")
    out_nets = body.distinct_nets(len(outputs), set(inputs))
    head = Body(rng)
    root_block(head, name, inputs, outputs, out_nets)
    finish(design, body, out_nets, sum(c.prims for _, c in chosen))

    phys = physical_part(rng, prims, regions)
    body.lines[0:0] = phys["blocks"]
    signals(body, rng, design, prims)
    body.lines.extend(phys["signals"])
    body.lines.extend(map_groups(rng, design, top_blocks, phys["tiles"]))
    return design, design_text(name, head.lines + body.lines)


def physical_part(rng, prims, regions):
    """The top's physical root and region instances, its PHYSSIGNALs, and
    the tiles that logical blocks can map onto."""
    part = Body(rng)
    n_pins = max(8, prims // 10000)
    roots = pin_names("px", n_pins)
    part.line(IND1, "PHYSBLOCK top %d (NAME=top) {" % n_pins)
    for pin in roots:
        part.line(IND2, "PIN %s (TYPE=IN CONN=%s)" % (pin, pin))
    part.line(IND1, "}")
    part.driven.extend(roots)
    tiles = []
    internal = []
    for r in range(max(2, round(prims / 10000))):
        region = rng.choice(regions)
        inst = "r%d" % r
        part.line(IND1, "PHYSBLOCK %s (NAME=%s) {" % (region.name, inst))
        for pin, net in zip(region.inputs, part.distinct_nets(len(region.inputs))):
            part.line(IND2, "PIN %s (CONN=%s)" % (pin, net))
        part.line(IND1, "}")
        tiles.extend("top/%s/%s" % (inst, t) for t in region.tiles)
        internal.extend("top/%s/%s" % (inst, n) for n in region.internal)
    sigs = Body(rng)
    for net in roots:
        sigs.line(IND1, "PHYSSIGNAL %s (ROUTE=global)" % net)
    for net in rng.sample(internal, len(internal) // 20):
        sigs.line(IND1, "PHYSSIGNAL %s (ROUTE=spine WEIGHT=%d)" % (net, rng.randint(1, 9)))
    return {"blocks": part.lines, "signals": sigs.lines, "tiles": tiles}


def merge_prop(rng, design, own_nets):
    kind = rng.choice(("MERGEDTO", "MERGEDFROM", "JOINED"))
    if kind == "JOINED" and rng.random() < 0.3:
        return "JOINED=gclk"
    target = None
    if rng.random() < 0.5:
        inst, child = rng.choice(design.instances)
        target = hier_net(rng, child, "top/" + inst)
    if target is None:
        target = "top/" + rng.choice(own_nets)
    return "%s=%s" % (kind, target)


def signals(body, rng, design, prims):
    """SIGNAL statements of the top: globals, own nets, nets inside instances."""
    for net in ("gclk", "grst", "gscan"):
        body.line(IND1, "SIGNAL %s (GLOBAL)" % net)
    own = [n for n in design.internal if n not in ("gclk", "grst", "gscan")]
    for net in rng.sample(own, min(len(own), prims // 400)):
        props = ["DRIVE=%d" % rng.randint(1, 8)]
        if rng.random() < 0.25:
            props.append(merge_prop(rng, design, own))
        body.line(IND1, "SIGNAL %s (%s)" % (net, " ".join(props)))
    seen = set()
    for _ in range(prims // 200):
        inst, child = rng.choice(design.instances)
        net = hier_net(rng, child, "top/" + inst)
        if net is None or net in seen:
            continue
        seen.add(net)
        props = [rng.choice(("DRIVE=%d" % rng.randint(1, 8), "LOAD=1.5", "KEEP", "CRIT=high"))]
        if rng.random() < 0.3:
            props.append(merge_prop(rng, design, own))
        body.line(IND1, "SIGNAL %s (%s)" % (net, " ".join(props)))


def nested_blocks(rng, path, child, share):
    """Some logical blocks below an instance, by hierarchical name."""
    found = []
    for inst, sub in child.instances:
        name = path + "/" + inst
        if rng.random() < share:
            found.append((name, sub))
        found.extend(nested_blocks(rng, name, sub, share))
    return found


def map_groups(rng, design, top_blocks, tiles):
    """MAPSIGNAL groups: each mapped logical block gets one tile as its
    physical parent (a group naming only the tile), and some of its pins
    map onto the tile's pins (a group per tile pin, with a map signal)."""
    blocks = list(top_blocks)
    for path, child in top_blocks:
        blocks.extend(nested_blocks(rng, path, child, 0.15))
    by_tile = {}
    for path, child in blocks:
        by_tile.setdefault(rng.choice(tiles), []).append((path, child))
    lines = []
    count = 0
    for tile in tiles:
        members = by_tile.get(tile)
        if not members:
            continue
        lines.append("%sMAPSIGNAL %s {%s" % (IND1, tile, CRLF))
        for path, _ in members:
            lines.append("%sMAPCONN %s%s" % (IND2, path, CRLF))
        lines.append(IND1 + "}" + CRLF)
        free = ["P%d" % j for j in range(TILE_INS + TILE_OUTS)]
        rng.shuffle(free)
        for path, child in members:
            pins = child.inputs + child.outputs
            for pin in rng.sample(pins, min(len(pins), 2)):
                if not free:
                    break
                count += 1
                lines.append("%sMAPSIGNAL %s %s (NAME=ms%d) {%s" % (IND1, tile, free.pop(), count,
                                                                    CRLF))
                inv = " (MAPINV)" if rng.random() < 0.1 else ""
                lines.append("%sMAPCONN %s %s%s%s" % (IND2, path, pin, inv, CRLF))
                lines.append(IND1 + "}" + CRLF)
    return lines


def generate(prims, seed):
    """The text as a list of strings, and a few counts."""
    if prims < 20000:
        raise ValueError("need --prims >= 20000")
    n_leaf = max(3, round(prims / 10000))
    n_ma = max(2, round(prims / 20000))
    n_mb = max(1, round(prims / 50000))
    n_reg = max(1, round(prims / 50000))
    text = ["// generated by gen_hier_vrx.py --prims %d --seed %d%s" % (prims, seed, CRLF),
            "// synthetic hierarchical benchmark%s" % CRLF]
    leaves = []
    for k in range(n_leaf):
        leaf, lines = make_leaf(seed, k)
        leaves.append(leaf)
        text.extend(lines)
    mas = []
    for k in range(n_ma):
        ma, lines = make_mid(seed, "ma", k, [("u", leaves, 3, 5)])
        mas.append(ma)
        text.extend(lines)
    mbs = []
    for k in range(n_mb):
        mb, lines = make_mid(seed, "mb", k, [("a", mas, 2, 4), ("u", leaves, 1, 3)])
        mbs.append(mb)
        text.extend(lines)
    regions = []
    for k in range(n_reg):
        region, lines = make_region(seed, k)
        regions.append(region)
        text.extend(lines)
    top, lines = make_top(seed, prims, leaves, mas, mbs, regions)
    text.extend(lines)
    stats = {"designs": n_leaf + n_ma + n_mb + n_reg + 1, "prims": top.prims,
             "top_instances": len(top.instances)}
    return text, stats


def main(argv=None):
    ap = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    ap.add_argument("--prims", type=int, required=True,
                    help="primitives in total, grafted copies included (at least 20000)")
    ap.add_argument("--seed", type=int, default=1)
    ap.add_argument("-o", "--output", help="output file (default: stdout)")
    ap.add_argument("--stats", action="store_true", help="print counts to standard error")
    args = ap.parse_args(argv)
    try:
        text, stats = generate(args.prims, args.seed)
    except ValueError as e:
        ap.error(str(e))
    data = "".join(text).encode("ascii")
    if args.output and args.output != "-":
        with open(args.output, "wb") as f:
            f.write(data)
    else:
        sys.stdout.buffer.write(data)
    if args.stats:
        stats["bytes"] = len(data)
        stats["text_prims"] = sum(1 for line in text if line.startswith(IND1 + "PRIM "))
        print(" ".join("%s=%d" % kv for kv in sorted(stats.items())), file=sys.stderr)
    return 0


if __name__ == "__main__":
    sys.exit(main())
