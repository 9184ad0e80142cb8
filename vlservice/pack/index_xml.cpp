#include "vlservice/pack/index_xml.h"

#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/container_format.h"
#include "vlservice/pack/index_tags.h"
#include "vlservice/pack/xml_depth.h"

#include <unicode/utf8.h>

#include <algorithm>
#include <charconv>
#include <memory>
#include <new>
#include <ostream>
#include <string_view>
#include <utility>

namespace Container {
namespace {

using BinEntry = PackWrapper::BinEntry;

template<typename Predicate>
bool allCodePoints(std::string_view text, Predicate const& holds) {
    for (std::size_t at = 0; at < text.size();) {
        UChar32 c;
        U8_NEXT(text.data(), at, text.size(), c);
        if (c < 0 || !holds(c))
            return false;
    }
    return true;
}

bool isUtf8(std::string_view text) {
    return allCodePoints(text, [](UChar32) { return true; });
}

std::string textAttribute(TiXmlElement const& element, char const* name) {
    std::string const* const value = element.Attribute(std::string(name));
    return value ? *value : std::string();
}

/// TinyXML's own typed reads go through int or through the global locale.
template<typename Number>
Number numberAttribute(TiXmlElement const& element, char const* name) {
    std::string const text = textAttribute(element, name);
    Number number = 0;
    std::from_chars(text.data(), text.data() + text.size(), number);
    return number;
}

std::unique_ptr<TiXmlElement> makeItem(BinEntry const& entry) {
    auto item = std::make_unique<TiXmlElement>(TAG_ITEM);
    item->SetAttribute(ITEM_NAME, entry.name);
    item->SetAttribute(ITEM_OFFSET, std::to_string(entry.offset));
    item->SetAttribute(ITEM_LENGTH, std::to_string(entry.length));
    item->SetAttribute(ITEM_ROLE, entry.role);
    item->SetAttribute(ITEM_CRC, std::to_string(entry.crc));
    if (entry.role == ROLE_PAGE)
        item->SetAttribute(ITEM_DOCUMENT, entry.document);
    return item;
}

std::unique_ptr<TiXmlElement> makeMailing(std::string const& packId, std::deque<BinEntry> const& items) {
    auto mailing = std::make_unique<TiXmlElement>(TAG_MAILING);
    mailing->SetAttribute(MAILING_ID, packId);
    for (BinEntry const& entry : items)
        mailing->LinkEndChild(makeItem(entry).release());
    mailing->SetAttribute(MAILING_ITEMS, std::to_string(items.size()));
    return mailing;
}

bool hasTooManyElements(std::string_view index, std::uint64_t bytesBesideIt) {
    auto const elements = static_cast<std::uint64_t>(std::count(index.begin(), index.end(), '<'));
    return elements > UNPROVEN_ELEMENTS &&
           (elements - UNPROVEN_ELEMENTS) > bytesBesideIt / DB_ZIP_HEADER_SIZE;
}

bool print(std::ostream& out, std::string const& packId, std::deque<BinEntry> const& items) {
    TiXmlDocument document;
    document.LinkEndChild(new TiXmlDeclaration("1.0", "UTF-8", "yes"));
    auto root = std::make_unique<TiXmlElement>(TAG_ROOT);
    root->LinkEndChild(makeMailing(packId, items).release());
    document.LinkEndChild(root.release());
    return static_cast<bool>(out << document);
}

/// The tag alone as an element of that name; empty when it cannot be parsed or is another.
std::unique_ptr<TiXmlDocument> parseTag(std::string tag, char const* name) {
    if (tag.size() < 2 || tag.back() != '>')
        return nullptr;
    tag.pop_back();
    if (tag.back() != '/')
        tag += '/';
    tag += '>';
    if (isNestedDeeperThan(1, tag))
        return nullptr;
    auto document = std::make_unique<TiXmlDocument>();
    document->Parse(tag.c_str(), nullptr, TIXML_ENCODING_LEGACY);
    bool const isWhole = !document->Error() && document->RootElement();
    return isWhole && document->RootElement()->ValueStr() == name ? std::move(document) : nullptr;
}

} // namespace

std::optional<BinEntry> itemInTag(std::string tag) {
    auto const document = parseTag(std::move(tag), TAG_ITEM);
    return document ? std::optional(readItem(*document->RootElement())) : std::nullopt;
}

std::optional<std::string> mailingIdInTag(std::string tag) {
    auto const document = parseTag(std::move(tag), TAG_MAILING);
    std::string const* const id =
        document ? document->RootElement()->Attribute(std::string(MAILING_ID)) : nullptr;
    return id ? std::optional(*id) : std::nullopt;
}

bool mayStandInIndex(std::string_view text) {
    return allCodePoints(text, [](UChar32 c) {
        return c >= 0x20 ? c != 0xFFFE && c != 0xFFFF : c == '\t' || c == '\n' || c == '\r';
    });
}

std::string parseIndex(TiXmlDocument& document, std::string text, std::uint64_t bytesBesideIt) {
    text.resize(std::min(text.find('\0'), text.size()));
    if (isNestedDeeperThan(MAX_XML_DEPTH, text))
        return "Error: elements are nested too deep.";
    if (hasTooManyElements(text, bytesBesideIt))
        return "Error: the index has more elements than the file has room for blobs.";
    // Text that is no UTF-8 is read byte by byte whatever it declares: TinyXML takes the length of a
    // character from its first byte and would run over markup, or past the end.
    TiXmlEncoding const encoding = isUtf8(text) ? TIXML_ENCODING_UNKNOWN : TIXML_ENCODING_LEGACY;
    document.Parse(text.c_str(), nullptr, encoding);
    return document.Error() ? document.ErrorDesc() : "";
}

BinEntry readItem(TiXmlElement const& item) {
    BinEntry entry;
    entry.name = textAttribute(item, ITEM_NAME);
    entry.offset = numberAttribute<std::uint64_t>(item, ITEM_OFFSET);
    entry.length = numberAttribute<std::uint32_t>(item, ITEM_LENGTH);
    entry.role = textAttribute(item, ITEM_ROLE);
    entry.crc = numberAttribute<std::uint32_t>(item, ITEM_CRC);
    entry.document = textAttribute(item, ITEM_DOCUMENT);
    return entry;
}

bool writeIndex(std::ostream& out, std::string const& packId, std::deque<BinEntry> const& items) {
    bool const printable =
        mayStandInIndex(packId) && std::all_of(items.begin(), items.end(), [](auto const& entry) {
            return mayStandInIndex(entry.name) && mayStandInIndex(entry.document);
        });
    try {
        return printable && print(out, packId, items);
    } catch (std::bad_alloc const&) {
        return false;
    }
}

} // namespace Container
