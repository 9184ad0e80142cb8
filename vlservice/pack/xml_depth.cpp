#include "vlservice/pack/xml_depth.h"

#include <algorithm>
#include <array>

namespace Container {
namespace {

using namespace std::string_view_literals;

constexpr bool isSpace(char c) { return " \t\n\v\f\r"sv.find(c) != std::string_view::npos; }
constexpr char lower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }
/// Every byte beyond ASCII may stand in a name.
constexpr bool startsName(char c) {
    return (lower(c) >= 'a' && lower(c) <= 'z') || c == '_' || static_cast<unsigned char>(c) >= 0x7F;
}
constexpr bool continuesName(char c) {
    return startsName(c) || (c >= '0' && c <= '9') || "-.:"sv.find(c) != std::string_view::npos;
}

/// Walks the markup. Every step that takes some gives false where the parser stops.
class Scan {
public:
    explicit Scan(std::string_view xml) : rest_(xml) {}

    bool goesDeeperThan(std::size_t limit) {
        while (deepest_ <= limit && findMarkup() && takeMarkup())
            continue;
        return deepest_ > limit;
    }

private:
    bool findMarkup() {
        skipSpace();
        if (depth_ > 0)
            skipWhile([](char c) { return c != '<'; });
        return at('<');
    }

    bool takeMarkup() {
        if (depth_ > 0 && rest_.starts_with("</"))
            return takeEndTag();
        if (startsIgnoringCase("<?xml"))
            return takeDeclaration();
        if (take("<!--"))
            return takeThrough("-->");
        if (take("<![CDATA["))
            return takeThrough("]]>");
        if (rest_.size() > 1 && startsName(rest_[1]))
            return takeStartTag();
        return takeThrough(">");
    }

    bool takeEndTag() {
        --depth_;
        return takeThrough(">");
    }

    bool takeStartTag() {
        deepest_ = std::max(deepest_, ++depth_);
        rest_.remove_prefix(1);
        skipSpace();
        skipWhile(continuesName);
        for (;;) {
            skipSpace();
            if (take("/")) {
                --depth_;
                return take(">");
            }
            if (take(">"))
                return true;
            if (!takeAttribute())
                return false;
        }
    }

    bool takeDeclaration() {
        rest_.remove_prefix("<?xml"sv.size());
        while (!rest_.empty()) {
            if (take(">"))
                return true;
            skipSpace();
            constexpr std::array attributes{"version"sv, "encoding"sv, "standalone"sv};
            if (std::any_of(attributes.begin(), attributes.end(),
                            [this](auto name) { return startsIgnoringCase(name); })) {
                if (!takeAttribute())
                    return false;
            } else {
                skipWhile([](char c) { return c != '>' && !isSpace(c); });
            }
        }
        return false;
    }

    bool takeAttribute() {
        skipSpace();
        if (rest_.empty() || !startsName(rest_.front()))
            return false;
        skipWhile(continuesName);
        skipSpace();
        if (!take("="))
            return false;
        skipSpace();
        if (take("\""))
            return takeThrough("\"");
        if (take("'"))
            return takeThrough("'");
        skipWhile([](char c) { return !isSpace(c) && "/>'\""sv.find(c) == std::string_view::npos; });
        return !at('"') && !at('\'') && !rest_.empty();
    }

    bool at(char c) const { return !rest_.empty() && rest_.front() == c; }

    bool startsIgnoringCase(std::string_view lowerCase) const {
        return rest_.size() >= lowerCase.size() &&
               std::equal(lowerCase.begin(), lowerCase.end(), rest_.begin(),
                          [](char wanted, char c) { return wanted == lower(c); });
    }

    bool take(std::string_view token) {
        if (!rest_.starts_with(token))
            return false;
        rest_.remove_prefix(token.size());
        return true;
    }

    bool takeThrough(std::string_view token) {
        std::size_t const found = rest_.find(token);
        if (found == std::string_view::npos)
            return false;
        rest_.remove_prefix(found + token.size());
        return true;
    }

    /// The byte order mark and the two characters that are none count as space wherever they stand.
    void skipSpace() {
        do
            skipWhile(isSpace);
        while (take("\xEF\xBB\xBF") || take("\xEF\xBF\xBE") || take("\xEF\xBF\xBF"));
    }

    template<typename Predicate>
    void skipWhile(Predicate const& matches) {
        rest_.remove_prefix(
            static_cast<std::size_t>(std::find_if_not(rest_.begin(), rest_.end(), matches) - rest_.begin()));
    }

    std::string_view rest_;
    std::size_t depth_ = 0;
    std::size_t deepest_ = 0;
};

} // namespace

bool isNestedDeeperThan(std::size_t limit, std::string_view xml) { return Scan(xml).goesDeeperThan(limit); }

} // namespace Container
