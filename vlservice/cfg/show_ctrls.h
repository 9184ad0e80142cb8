#pragma once
// Which controls of the user interface are shown.

#include "vlservice/export.h"
#include "vlservice/json/json.h"
#include "vlservice/json/json_form.h"

#include <bitset>
#include <cstddef>

namespace Cfg {

/// A set of bits, one for each control. What each stands for is the user interface's affair.
/// JSON: an array of integers of 64 bits each, lowest first, as signed numbers; always two of them when
/// written.
class VLSERVICE_EXPORT ShowCtrls {
public:
    static constexpr std::size_t COUNT = 78; ///< how many controls there are
    using Bits = std::bitset<COUNT>;         ///< a bit for each control

    ShowCtrls() = default;
    explicit ShowCtrls(Bits const& bits) : bits_(bits) {} ///< of these bits
    /// Integers that are missing leave their bits clear, and what is behind the last bit is dropped. The
    /// empty handle has no bit set. Throws json::Exc when the node is no array or an element no integer.
    ShowCtrls(json::Value const& node);

    Bits const& bits() const { return bits_; } ///< one that is set is shown
    Bits& bits() { return bits_; }             ///< for changing
    json::Array serialize() const;
    friend bool operator==(ShowCtrls const&, ShowCtrls const&) = default;

private:
    Bits bits_;
};

} // namespace Cfg

template<>
struct json::Form<Cfg::ShowCtrls> {
    static Cfg::ShowCtrls read(Value const& node) { return node; }
    static Value write(Cfg::ShowCtrls const& controls) { return controls.serialize(); }
    static KeyForm describe() { return {KeyType::Numbers}; }
};
