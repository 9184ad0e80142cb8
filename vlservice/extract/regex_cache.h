#pragma once
// The place where an object keeps its pattern compiled.

#include <memory>
#include <string>

namespace Cfg {

class FieldRegex;
class NameRegex;

/// A compiled pattern that belongs to its place: it is neither copied nor assigned. A copy starts empty, and
/// an assignment leaves the target's as it was, so its owner goes on matching by it. This is deliberate:
/// owners are copied often and matched rarely, and programs rely on a definition answering by one pattern
/// until it is rebuilt. Filled without a lock; several threads may use it once it is filled.
template<typename Regex>
class RegexCache {
public:
    RegexCache() noexcept = default;
    RegexCache(RegexCache const&) noexcept {}
    RegexCache& operator=(RegexCache const&) noexcept { return *this; }

    /// The compiled pattern; `pattern` and what else the expression is made from count only while the cache
    /// is empty. A pattern that does not compile throws and leaves it empty.
    template<typename... Rest>
    Regex const& get(std::string const& pattern, Rest const&... rest) const {
        if (!compiled_)
            compiled_ = std::make_shared<Regex const>(pattern, rest...);
        return *compiled_;
    }

    /// From here on by the other's compiled pattern, or by none if it has none.
    void shareWith(RegexCache const& other) noexcept { compiled_ = other.compiled_; }
    void clear() noexcept { compiled_.reset(); }                    ///< compiled anew when it is next wanted
    bool isFilled() const noexcept { return compiled_ != nullptr; } ///< it has been compiled

private:
    mutable std::shared_ptr<Regex const> compiled_;
};

} // namespace Cfg
