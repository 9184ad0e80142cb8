#pragma once
// How deep the elements of an XML text are nested, told without recursion.

#include <cstddef>
#include <string_view>

namespace Container {

/// Guards a parser that recurses once for each level: true when it would go deeper than `limit`. Markup is
/// told apart as TinyXML does it, byte by byte, so that nothing which it takes for a comment or a quoted
/// value can hide a level; like it, the scan ends at text outside of elements and at broken markup.
bool isNestedDeeperThan(std::size_t limit, std::string_view xml);

} // namespace Container
