#pragma once
// The text of what an operation throws.

#include <exception>
#include <string>

/// The text of the exception that leaves `operation`; "nothing was thrown" when none does.
template<typename Operation>
std::string failureOf(Operation operation) {
    try {
        operation();
    } catch (std::exception const& failure) {
        return failure.what();
    }
    return "nothing was thrown";
}
