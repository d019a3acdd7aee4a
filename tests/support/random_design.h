// Seeded random designs and libraries for round-trip tests.
//
// The same seed always gives the same structure. A design holds a logical and
// (usually) a physical hierarchy of blocks and primitives of every type, pins
// with names, directions, inversion and map inversion, signals and global
// signals joined into networks through block pins, properties of every kind
// (object properties pointing anywhere in the design), map signals with their
// connections, and physical parents. A library adds aliases and its case-sense
// flag. Names are absent, empty or odd now and then, so that readers and
// writers meet them.
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
};

/// Fills an empty design with random content drawn from `seed`.
void fill_random_design(HX_DESIGN& design, uint64_t seed, const RandomDesignOptions& options = {});

/// A new library of `env` with `designs` random designs, aliases, library
/// properties and a random case-sense flag. The caller deletes it through
/// `env.delete_library`.
HX_LIBRARY* make_random_library(HX_ENVIRONMENT& env, uint64_t seed, int designs = 3,
                                const RandomDesignOptions& options = {});

}  // namespace vrx_test
