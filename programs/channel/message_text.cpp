#include "programs/channel/message_text.h"

#include "programs/base/utf8.h"
#include "vlservice/json/json_text.h"

#include <sstream>

namespace Channel {
namespace {

constexpr char const* ERR = "err";

} // namespace

std::string print(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return std::move(text).str();
}

json::Object parse(std::string_view text) { return json::strToObject(text.data(), text.size()); }

std::string printError(std::string const& reason) { return print({{ERR, Base::validUtf8(reason)}}); }

std::string reasonOf(std::string_view errorText) {
    try {
        return parse(errorText).get(ERR).toString();
    } catch (json::Exc const&) {
        return "It gave no reason.";
    }
}

} // namespace Channel
