#pragma once
// The JSON side of a command, which is reached through its base.

#include "vlservice/json/json_text.h"
#include "vlservice/platform/cmd.h"

#include <sstream>
#include <string>
#include <string_view>

inline std::string text(json::Object const& object) {
    std::ostringstream out;
    out << object;
    return out.str();
}

inline json::Object parse(std::string_view text) { return json::strToObject(text.data(), text.size()); }

inline std::string reqOf(Ipc::JsonCmdBase const& cmd) { return text(cmd.serializeReq()); }
inline std::string respOf(Ipc::JsonCmdBase const& cmd) { return text(cmd.serializeResp()); }
inline void readReq(Ipc::JsonCmdBase& cmd, std::string_view text) { cmd.deserializeReq(parse(text)); }
inline void readResp(Ipc::JsonCmdBase& cmd, std::string_view text) { cmd.deserializeResp(parse(text)); }

/// The text of the json::Exc that `step` throws; empty when it throws none.
template<typename Step>
std::string jsonError(Step step) {
    try {
        step();
    } catch (json::Exc const& e) {
        return e.what();
    }
    return {};
}
