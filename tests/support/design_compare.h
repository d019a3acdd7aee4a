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

/// The first difference found, as "where: what", or empty when equal.
std::string compare_designs(const HX_DESIGN& a, const HX_DESIGN& b);
std::string compare_libraries(const HX_LIBRARY& a, const HX_LIBRARY& b);

}  // namespace vrx_test
