#include "programs/vlmail/pack/index_remains.h"

#include "programs/base/utf8.h"
#include "vlservice/pack/container_format.h"
#include "vlservice/pack/index_tags.h"

#include <utility>

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

template<typename Take>
void forEachTag(ByteFile& file, std::string const& name, Take const& take) {
    std::string const start = '<' + name + ' ';
    for (auto at = file.find(start, 0); at; at = file.find(start, *at + start.size()))
        take(tagAt(file, *at));
}

} // namespace

IndexRemains findIndexRemains(ByteFile& file) {
    IndexRemains remains;
    forEachTag(file, Container::TAG_MAILING, [&](std::string tag) {
        if (auto const id = Container::mailingIdInTag(std::move(tag)))
            remains.packId = writable(*id);
    });
    forEachTag(file, Container::TAG_ITEM, [&](std::string tag) {
        if (auto item = Container::itemInTag(std::move(tag))) {
            item->name = writable(item->name);
            item->document = writable(item->document);
            remains.items.push_back(std::move(*item));
        }
    });
    return remains;
}

} // namespace VlMail
