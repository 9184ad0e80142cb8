#include "programs/protocol/query.h"

#include "programs/base/error.h"

namespace Protocol {
namespace {

constexpr char const* QUERY = "query";

} // namespace

json::Object question(char const* kind) { return {{QUERY, kind}}; }

std::string kindOf(json::Object const& question) { return question.get(QUERY).textOrEmpty(); }

std::string nodeIn(json::Object const& question, std::string const& owner) {
    json::Value const node = question.get(NODE_ID);
    if (!node.isString())
        throw Base::Error(Base::Code::RequestInvalid, "\"id\" of " + owner + " has to be the id of a node");
    return node.toString();
}

} // namespace Protocol
