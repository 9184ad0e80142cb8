#include "programs/vlmail/workbench/answer.h"

#include "programs/base/error.h"
#include "programs/base/utf8.h"
#include "vlservice/json/json_text.h"

#include <sstream>
#include <utility>

namespace VlMail::Workbench {

int statusFor(Base::Code code) {
    switch (code) {
    case Base::Code::RequestInvalid:
    case Base::Code::JsonMalformed:
        return 400;
    case Base::Code::TokenRefused:
    case Base::Code::NotAllowed:
        return 403;
    case Base::Code::DocumentUnknown:
        return 404;
    case Base::Code::FileExists:
    case Base::Code::SettingsChanged:
    case Base::Code::Superseded:
        return 409;
    default:
        return 422;
    }
}

Answer answerOf(json::Object const& object, int status) {
    std::ostringstream text;
    text << object << '\n';
    return {status, "application/json", std::move(text).str()};
}

Answer failureOf(int status, Base::Code code, std::string const& line) {
    return answerOf(
        {{"error", json::Object{{"code", std::string(Base::nameOf(code))}, {"line", Base::validUtf8(line)}}}},
        status);
}

Answer failureOf(std::exception const& failure) {
    if (dynamic_cast<json::Exc const*>(&failure))
        return failureOf(400, Base::Code::RequestInvalid,
                         std::string("a parameter of the request is wrong: ") + failure.what());
    Base::Code const code = Base::codeOf(failure);
    return failureOf(statusFor(code), code, failure.what());
}

} // namespace VlMail::Workbench
