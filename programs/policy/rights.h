#pragma once
// Who may do what: the holder of a token has a role at a node, and every command and question wants one.

#include "programs/protocol/token.h"

#include <optional>
#include <string>
#include <vector>

namespace Policy {

using Protocol::Role;

/// What the holder of a token may do, and where: at the node and all below it; at the root everywhere.
struct Grant {
    /// Of the token.
    std::string name;
    Role role = Role::Read;
    std::string node;

    bool covers(std::string const& nodeId) const;
    /// Of the service itself, which is nobody's and may do everything.
    static Grant ofService() { return {{}, Role::Admin, {}}; }
};

/// Where a command wants its role.
enum class Place {
    /// At the node that it names, or that what it is about belongs to.
    Node,
    /// At the root: it is about the service as a whole.
    Root,
    /// Anywhere: of nodes that the token does not cover it tells nothing, and changes nothing at them.
    Anywhere,
};

struct Right {
    Role role = Role::Admin;
    Place place = Place::Root;
};

/// What the command of that number wants; nothing when there is no such command. Of the command that carries
/// questions each question wants its own.
std::optional<Right> rightFor(unsigned char command);
std::optional<Right> rightFor(std::string const& question);
/// The kinds of questions that something is said of here.
std::vector<std::string> knownQuestions();

/// Why the grant does not suffice for something that is about that node, as one line; empty when it does.
std::string refusalOf(Grant const& grant, Right const& right, std::string const& node);
/// Why the holder may not give out that grant; empty when he may. Nobody gives out more than he has.
std::string refusalOfGranting(Grant const& holder, Role role, std::string const& node);

} // namespace Policy
