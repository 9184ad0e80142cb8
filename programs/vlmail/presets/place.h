#pragma once
// Where something stands in a JSON document.

#include <cstddef>
#include <span>
#include <string>
#include <string_view>

namespace VlMail {

/// A JSON pointer, such as "/presets/extract_presets/2/match"; the document itself is the empty one.
class Place {
public:
    Place operator/(std::string_view key) const {
        std::string pointer = pointer_ + '/';
        for (char const c : key)
            pointer += c == '~' ? "~0" : c == '/' ? "~1" : std::string(1, c);
        return Place(std::move(pointer));
    }
    Place operator/(std::span<std::string const> steps) const {
        Place place = *this;
        for (std::string const& step : steps)
            place = place / step;
        return place;
    }
    Place operator/(std::size_t index) const { return Place(pointer_ + '/' + std::to_string(index)); }

    std::string const& pointer() const { return pointer_; }

    Place() = default;

private:
    explicit Place(std::string pointer) : pointer_(std::move(pointer)) {}

    std::string pointer_;
};

} // namespace VlMail
