#pragma once
// How programs fail towards people.

#include <stdexcept>

namespace Base {

/// A failure as a person reads it: one line that says what failed, where, and what to do.
class Error : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

} // namespace Base
