#pragma once
// What the reader says when it cannot read.

#include <stdexcept>

namespace Reader {

/// A failure as a person reads it: one line that says what failed, where, and what to do.
class Error : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

} // namespace Reader
