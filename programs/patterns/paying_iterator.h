#pragma once
// An iterator over code points that pays for every look out of a budget, so that the matcher ends soon
// whatever the pattern. The matcher compares at each of its steps, so looks count steps, the same on every
// machine.

#include <unicode/umachine.h>

#include <cstddef>
#include <iterator>

namespace Patterns {

struct BudgetSpent {};

/// What all iterators over one text share.
struct Budget {
    std::size_t left;

    void look() {
        if (left == 0)
            throw BudgetSpent();
        --left;
    }
};

/// Looking throws BudgetSpent when nothing is left. The budget must outlive the iterator.
class PayingIterator {
public:
    using iterator_category = std::bidirectional_iterator_tag;
    using value_type = UChar32;
    using difference_type = std::ptrdiff_t;
    using pointer = UChar32 const*;
    using reference = UChar32 const&;

    PayingIterator() = default;
    PayingIterator(UChar32 const* at, Budget& budget) : at_(at), budget_(&budget) {}

    reference operator*() const {
        budget_->look();
        return *at_;
    }
    PayingIterator& operator++() {
        ++at_;
        return *this;
    }
    PayingIterator operator++(int) {
        PayingIterator const before = *this;
        ++at_;
        return before;
    }
    PayingIterator& operator--() {
        --at_;
        return *this;
    }
    PayingIterator operator--(int) {
        PayingIterator const before = *this;
        --at_;
        return before;
    }
    friend bool operator==(PayingIterator const& a, PayingIterator const& b) { return a.at_ == b.at_; }
    friend bool operator!=(PayingIterator const& a, PayingIterator const& b) { return a.at_ != b.at_; }

private:
    UChar32 const* at_ = nullptr;
    Budget* budget_ = nullptr;
};

} // namespace Patterns
