#pragma once
// The index of a container as XML, both ways.

#include "vlservice/pack/pack_wrapper.h"

#include <tinyxml.h>

#include <deque>
#include <iosfwd>
#include <string>

namespace Container {

/// Elements of an index nested deeper than this are refused: the parser recurses.
inline constexpr std::size_t MAX_XML_DEPTH = 64;

/// Parses what stands before the first zero byte. Gives the description of what is wrong, empty when the
/// document is good; after an error it is partly filled and of no use.
std::string parseIndex(TiXmlDocument& document, std::string text);

/// What is not there or unreadable stays empty or zero.
PackWrapper::BinEntry readItem(TiXmlElement const& item);

/// False when the id or a name cannot stand in XML, when the stream fails, or when memory does.
bool writeIndex(std::ostream& out, std::string const& packId, std::deque<PackWrapper::BinEntry> const& items);

} // namespace Container
