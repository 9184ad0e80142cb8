#pragma once
// The index of a container as XML, both ways.

#include "vlservice/pack/pack_wrapper.h"

#include <tinyxml.h>

#include <cstdint>
#include <deque>
#include <iosfwd>
#include <string>

namespace Container {

/// Elements of an index nested deeper than this are refused: the parser recurses.
inline constexpr std::size_t MAX_XML_DEPTH = 64;

/// More elements than this are read only where the file has room for as many blobs: the parser's tree takes
/// tens of times the memory of an element's text.
inline constexpr std::uint64_t UNPROVEN_ELEMENTS = 100'000;

/// Parses what stands before the first zero byte, of a file with so many bytes beside the index. Gives the
/// description of what is wrong, empty when the document is good; after an error it is partly filled and of
/// no use.
std::string parseIndex(TiXmlDocument& document, std::string text, std::uint64_t bytesBesideIt);

/// What is not there or unreadable stays empty or zero.
PackWrapper::BinEntry readItem(TiXmlElement const& item);

/// False when the id or a name cannot stand in XML, when the stream fails, or when memory does.
bool writeIndex(std::ostream& out, std::string const& packId, std::deque<PackWrapper::BinEntry> const& items);

} // namespace Container
