#include "programs/channel/message_text.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"

#include "vlservice/json/json_text.h"

#include <sstream>

namespace Channel {
namespace {

constexpr char const* ERR = "err";
constexpr std::size_t MIB = 1024 * 1024;

/// What a value takes, by the character that it begins with or stands behind.
std::size_t memoryOf(char structural) {
    switch (structural) {
    case '{':
        return 256;
    case '[':
        return 128;
    case '"':
    case ':':
        return 64;
    case ',':
        return 48;
    default:
        return 0;
    }
}

/// What the values in a text take, or somewhat more.
std::size_t memoryOf(std::string_view text) {
    std::size_t memory = text.size();
    for (std::size_t at = 0; at < text.size(); ++at) {
        memory += memoryOf(text[at]);
        if (text[at] != '"')
            continue;
        for (++at; at < text.size() && text[at] != '"'; ++at)
            at += text[at] == '\\' ? 1 : 0;
    }
    return memory;
}

} // namespace

std::string print(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return std::move(text).str();
}

json::Object parse(std::string_view text, std::size_t limit) {
    if (memoryOf(text) > limit)
        throw Base::Error(Base::Code::TooLarge, "The values of a message of " + std::to_string(text.size()) +
                                                    " bytes would take more than " +
                                                    std::to_string(limit / MIB) + " MiB of memory.");
    return json::strToObject(text.data(), text.size());
}

std::string printError(std::string const& reason) {
    // What is cut is the line and not its code.
    Base::Error const said = Base::errorSaid(reason, Base::Code::Unexpected);
    std::string const line = Base::oneLine(said.what());
    return print({{ERR, said.what() == reason ? line : Base::codedLine(line, said.code())}});
}

std::string reasonOf(std::string_view errorText) {
    try {
        return parse(errorText).get(ERR).toString();
    } catch (std::exception const&) {
        return "It gave no reason.";
    }
}

} // namespace Channel
