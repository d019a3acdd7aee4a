// Seeded random designs and libraries for round-trip tests.
//
// The same seed always gives the same structure. A design holds a logical and
// (usually) a physical hierarchy of blocks and primitives of every type, pins
// with names, directions, inversion and map inversion, signals and global
// signals joined into networks through block pins, properties of every kind
// (object properties pointing anywhere in the design), map signals with their
// connections, and physical parents. A library adds aliases and its case-sense
// flag. Names are absent, empty or odd now and then, so that readers and
// writers meet them; RandomDesignOptions::text_expressible keeps to what a
// text netlist carries.
#pragma once

#include <cstdint>

class HX_DESIGN;
class HX_ENVIRONMENT;
class HX_LIBRARY;

namespace vrx_test {

struct RandomDesignOptions {
    int blocks = 40;        ///< blocks and primitives, roots included
    int signals = 60;       ///< signals inside blocks
    int globals = 4;        ///< global signals
    int connections = 150;  ///< connection attempts (taken pin sides are skipped)
    int props = 40;         ///< properties spread over the objects
    int map_signals = 6;    ///< map signals on physical pins
    int merges = 2;         ///< signals merged into global signals
    /// Names and text values with a double quote now and then. The text
    /// format cannot carry those, so tests of written text turn this off.
    bool quotes_in_names = true;
    /// Only what a text netlist carries, so that a design written as text
    /// and read back equals the original (compared structurally, see
    /// design_compare.h). Implies no quotes in names. Such a design has:
    /// - names on every block, pin, signal and global signal, none empty,
    ///   none with a double quote (tab, line feed, braces and blanks are
    ///   fine: they are quoted), and none longer than 1022 bytes; names
    ///   unique among a block's pins, among siblings and among a block's
    ///   signals, and root names that begin with the design's name, so that
    ///   the hierarchical names of blocks are unique within a library (a
    ///   block with children becomes a design of its own, named so);
    /// - signals only in roots and in blocks with children (a leaf block has
    ///   no section to hold them), each connected to a pin or carrying a
    ///   network property; global signals only on the outer side of child
    ///   pins, each on at least one, none merged from another signal;
    /// - USER only on logical blocks, and only the value 1;
    /// - primitives of the width-taking types at least 2 wide, their pins
    ///   with their default directions;
    /// - map signals named (not with an empty name), connected only to logical blocks that
    ///   they make the physical parent of; map inversion only on the pins of
    ///   map connections;
    /// - properties of the kind their name reads back as: free names as a
    ///   flag, a parameter, or a string neither empty nor starting with '@';
    ///   DRIVE as an integer other than INT32_MIN, LOAD as a float that six
    ///   decimals hold exactly; timing (MAXDELAY) and pin references
    ///   (CLKREF) only on the pins of child blocks and primitives, pin
    ///   references after a pin's other properties; no object
    ///   references; no properties on roots or their pins; on signals only
    ///   SIG_ALIAS, USER_ALIAS and RECOVERED_NAME (the others belong to the
    ///   network); no names the reader reserves (NAME, TYPE, CONN, ...);
    /// - libraries named, without integer properties.
    bool text_expressible = false;
    /// Every block and primitive directly in a root: no hierarchy below.
    bool flat = false;
};

/// Fills an empty design with random content drawn from `seed`.
void fill_random_design(HX_DESIGN& design, uint64_t seed, const RandomDesignOptions& options = {});

/// A new library of `env` with `designs` random designs, aliases, library
/// properties and a random case-sense flag. The caller deletes it through
/// `env.delete_library`.
HX_LIBRARY* make_random_library(HX_ENVIRONMENT& env, uint64_t seed, int designs = 3,
                                const RandomDesignOptions& options = {});

}  // namespace vrx_test
