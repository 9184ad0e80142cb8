#pragma once
// Node ids that come from outside: only well-formed ones of a bounded length name a node here.

#include <string>

namespace VlServiced {

/// Bytes of an id, and tokens in it: enough for deep trees, and few enough that the chain of an id, which
/// holds every tail of it, stays small.
constexpr std::size_t MAX_NODE_ID_BYTES = 1024;
constexpr std::size_t MAX_NODE_ID_TOKENS = 32;

/// Throws Error unless the text is empty (the root) or reads: at most one user token "u=", any number of
/// group tokens "ou=", then an account token "a=" or, without an account, a closing slash. Names are not
/// empty and hold no control characters.
void checkNodeId(std::string const& id);

/// The id of the node above; the empty text above a single token and for the root.
std::string parentNodeId(std::string const& id);

} // namespace VlServiced
