#include "programs/protocol/query.h"

namespace Protocol {
namespace {

constexpr char const* QUERY = "query";

} // namespace

json::Object question(char const* kind) { return {{QUERY, kind}}; }

std::string kindOf(json::Object const& question) { return question.get(QUERY).textOrEmpty(); }

} // namespace Protocol
