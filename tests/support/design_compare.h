// Whole-structure comparison of two designs or libraries, for round-trip
// tests. Objects of the two sides are paired by their position in the
// database's own orders (blocks in creation order, a block's signals, the
// global signals, networks, map signals), so the comparison also checks every
// order a writer relies on. Pointers (connections, object properties,
// physical parents) are compared through the positions of their targets.
#pragma once

#include <string>

class HX_DESIGN;
class HX_LIBRARY;

namespace vrx_test {

struct CompareOptions {
    /// Pair objects by their place rather than by creation order: blocks by
    /// their path of child positions from a root, signals by their block and
    /// name, global signals by name, networks by their highest signal, map
    /// signals by their pin. Lists whose order is only the order of creation
    /// (a block's signals, a signal's connections, a physical block's
    /// logical children) are compared as sets, and network tags are not
    /// compared. For designs rebuilt from text, which makes objects in the
    /// order the text names them and gives networks new tags.
    bool structural = false;
    /// Libraries: pair designs by name, and let `b` hold designs that `a`
    /// lacks (text gives every block with children a design of its own).
    bool extra_designs = false;
};

/// The first difference found, as "where: what", or empty when equal.
std::string compare_designs(const HX_DESIGN& a, const HX_DESIGN& b,
                            const CompareOptions& options = {});
std::string compare_libraries(const HX_LIBRARY& a, const HX_LIBRARY& b,
                              const CompareOptions& options = {});

}  // namespace vrx_test
