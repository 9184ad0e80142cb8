#pragma once
// What the page is answered.

#include "programs/base/error_code.h"
#include "vlservice/json/json.h"

#include <exception>
#include <new>
#include <string>

namespace VlMail::Workbench {

struct Answer {
    int status = 200;
    std::string type;
    std::string body;
};

/// The status that a failure of that kind is told by.
int statusFor(Base::Code code);

Answer answerOf(json::Object const& object, int status = 200);
/// {"error": {"code", "line"}}.
Answer failureOf(int status, Base::Code code, std::string const& line);
/// With the status that goes with its code; a value of another type than is wanted is a wrong parameter.
Answer failureOf(std::exception const& failure);

/// What a function gives, whose failure is an answer; of memory, nothing is told.
template<typename Function>
Answer answered(Function function) {
    try {
        return function();
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const& failure) {
        return failureOf(failure);
    }
}

/// As HTTP sends it, with what keeps a browser from doing anything with it but showing it here.
std::string wireTextOf(Answer const& answer, bool keepsAlive);

} // namespace VlMail::Workbench
