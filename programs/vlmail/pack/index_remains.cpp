#include "programs/vlmail/pack/index_remains.h"

#include "programs/base/utf8.h"
#include "vlservice/pack/container_format.h"

#include <tinyxml.h>

#include <charconv>
#include <memory>

namespace VlMail {
namespace {

/// A tag that is longer is damaged.
constexpr std::size_t LONGEST_TAG = std::size_t{1} << 16;

/// From "<" to ">", or empty when that does not come. A ">" in quotes is none.
std::string tagAt(ByteFile& file, std::uint64_t position) {
    std::string_view const text = file.bytesAt(position, LONGEST_TAG);
    char quote = '\0';
    for (std::size_t i = 1; i < text.size(); ++i) {
        char const c = text[i];
        if (quote) {
            quote = c == quote ? '\0' : quote;
        } else if (c == '"' || c == '\'') {
            quote = c;
        } else if (c == '<') {
            break;
        } else if (c == '>') {
            return std::string(text.substr(0, i + 1));
        }
    }
    return {};
}

/// The tag alone as an element; null when it cannot be parsed.
std::unique_ptr<TiXmlDocument> parseTag(std::string tag) {
    if (tag.empty())
        return nullptr;
    if (tag[tag.size() - 2] != '/')
        tag.insert(tag.size() - 1, "/");
    auto document = std::make_unique<TiXmlDocument>();
    // Byte by byte: a damaged character must not make the parser skip what follows.
    document->Parse(tag.c_str(), nullptr, TIXML_ENCODING_LEGACY);
    return document->Error() || !document->RootElement() ? nullptr : std::move(document);
}

/// Fit to be written into an index: valid text without what XML cannot hold.
std::string writable(std::string const& text) {
    std::string name = Base::validUtf8(text);
    for (char& c : name)
        if (static_cast<unsigned char>(c) < 0x20)
            c = '_';
    for (std::string const noCharacter : {"\xEF\xBF\xBE", "\xEF\xBF\xBF"})
        for (auto at = name.find(noCharacter); at != std::string::npos; at = name.find(noCharacter, at))
            name.replace(at, noCharacter.size(), "_");
    return name;
}

std::string textOf(TiXmlElement const& element, char const* attribute) {
    std::string const* const text = element.Attribute(std::string(attribute));
    return text ? *text : std::string();
}

template<typename Number>
Number numberOf(TiXmlElement const& element, char const* attribute) {
    std::string const text = textOf(element, attribute);
    Number number = 0;
    std::from_chars(text.data(), text.data() + text.size(), number);
    return number;
}

PackWrapper::BinEntry itemOf(TiXmlElement const& element) {
    PackWrapper::BinEntry item;
    item.name = writable(textOf(element, Container::ITEM_NAME));
    item.offset = numberOf<std::uint64_t>(element, Container::ITEM_OFFSET);
    item.length = numberOf<std::uint32_t>(element, Container::ITEM_LENGTH);
    item.role = textOf(element, Container::ITEM_ROLE);
    item.crc = numberOf<std::uint32_t>(element, Container::ITEM_CRC);
    item.document = writable(textOf(element, Container::ITEM_DOCUMENT));
    return item;
}

template<typename Take>
void forEachTag(ByteFile& file, std::string const& name, Take const& take) {
    std::string const start = '<' + name + ' ';
    for (auto at = file.find(start, 0); at; at = file.find(start, *at + start.size()))
        if (auto const document = parseTag(tagAt(file, *at)))
            take(*document->RootElement());
}

} // namespace

IndexRemains findIndexRemains(ByteFile& file) {
    IndexRemains remains;
    forEachTag(file, Container::TAG_MAILING, [&](TiXmlElement const& mailing) {
        if (std::string const* const id = mailing.Attribute(std::string(Container::MAILING_ID)))
            remains.packId = writable(*id);
    });
    forEachTag(file, Container::TAG_ITEM,
               [&](TiXmlElement const& item) { remains.items.push_back(itemOf(item)); });
    return remains;
}

} // namespace VlMail
