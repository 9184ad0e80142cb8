#pragma once
// What the page is answered.

#include "programs/base/error_code.h"
#include "vlservice/json/json.h"

#include <exception>
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
/// With the status that goes with its code.
Answer failureOf(std::exception const& failure);

/// As HTTP sends it, with what keeps a browser from doing anything with it but showing it here.
std::string wireTextOf(Answer const& answer, bool keepsAlive);

} // namespace VlMail::Workbench
