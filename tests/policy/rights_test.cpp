// What tokens allow: every command and every question against every role and every place of a node.

#include "programs/policy/rights.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/make_empty_cmd.h"

#include <gmock/gmock.h>

#include <map>
#include <string>
#include <vector>

namespace {

using Policy::Grant;
using Policy::Place;
using Policy::Right;
using Policy::Role;

TEST(RightsOfCommands, StandForEachCommandOfTheChannel) {
    for (int number = 0; number < 256; ++number) {
        auto const id = static_cast<unsigned char>(number);
        // Each of its questions has a right.
        bool const isCommand = Ipc::makeEmptyCmd(id, nullptr) && id != Ipc::CSConfigIdsList::CMD_ID;
        EXPECT_EQ(Policy::rightFor(id).has_value(), isCommand) << number;
    }
}

/// The lowest role that suffices, and where: "node", "root", or "any" where the token's node does not matter.
struct Row {
    char const* role;
    char const* place;
};

std::map<std::string, Row> const OF_QUESTIONS{
    {"settings", {"read", "node"}},
    {"documents", {"read", "node"}},
    {"document_piece", {"read", "any"}},
    {"put_document", {"settings", "node"}},
    {"remove_document", {"settings", "node"}},
    {"jobs", {"read", "any"}},
    {"change_jobs", {"send", "any"}},
    {"change_letter", {"send", "any"}},
    {"delivery_report", {"send", "any"}},
    {"begin_pack", {"send", "node"}},
    {"carriers", {"admin", "root"}},
    {"change_carrier", {"admin", "root"}},
    {"add_token", {"admin", "node"}},
    {"tokens", {"admin", "any"}},
    {"revoke_token", {"admin", "any"}},
    {"health", {"admin", "root"}},
    {"history", {"admin", "any"}},
    {"settings_impact", {"settings", "node"}},
    {"replace_settings", {"settings", "node"}},
    {"register", {"send", "node"}},
};

std::map<int, Row> const OF_COMMANDS{
    {10, {"settings", "node"}}, {12, {"settings", "node"}}, {13, {"settings", "node"}},
    {14, {"settings", "node"}}, {15, {"settings", "node"}}, {16, {"settings", "node"}},
    {17, {"settings", "node"}}, {18, {"read", "any"}},      {19, {"read", "any"}},
    {20, {"send", "any"}},      {21, {"read", "any"}},      {22, {"settings", "node"}},
    {24, {"read", "any"}},      {25, {"send", "any"}},      {26, {"admin", "root"}},
    {27, {"admin", "root"}},    {30, {"admin", "root"}},
};

/// Of a token at that node, which of the nodes below it covers.
struct Cover {
    char const* node;
    std::vector<std::string> covered;
    std::vector<std::string> others;
};

std::vector<Cover> const COVERS{
    {"", {"", "a=acme", "ou=sales/a=acme", "u=bob/ou=sales/a=acme", "ou=it/", "a=other"}, {}},
    {"a=acme",
     {"a=acme", "ou=sales/a=acme", "u=bob/ou=sales/a=acme", "u=bob/a=acme"},
     {"", "a=other", "a=acme2", "ou=a=acme/a=other", "ou=sales/"}},
    {"ou=sales/a=acme",
     {"ou=sales/a=acme", "u=bob/ou=sales/a=acme", "ou=south/ou=sales/a=acme"},
     {"", "a=acme", "ou=presales/a=acme", "u=bob/a=acme", "ou=sales/a=other", "ou=sales/"}},
    {"u=bob/a=acme", {"u=bob/a=acme"}, {"", "a=acme", "u=eve/a=acme", "u=bob/ou=sales/a=acme"}},
    {"ou=it/", {"ou=it/", "u=eve/ou=it/"}, {"", "ou=it/a=acme", "u=eve/"}},
};

TEST(Grants, CoverTheirNodeAndAllBelowIt) {
    for (Cover const& cover : COVERS) {
        Grant const grant{"office", Role::Read, cover.node};
        for (std::string const& node : cover.covered)
            EXPECT_TRUE(grant.covers(node)) << cover.node << ": " << node;
        for (std::string const& node : cover.others)
            EXPECT_FALSE(grant.covers(node)) << cover.node << ": " << node;
    }
}

bool isEnough(Role role, Row const& row, bool isCovered, bool isAtRoot) {
    std::vector<std::string> const roles{"read", "send", "settings", "admin"};
    auto const rank = [&](std::string const& name) {
        return std::find(roles.begin(), roles.end(), name) - roles.begin();
    };
    bool const isThere = row.place == std::string("any") || (row.place == std::string("node") && isCovered) ||
                         (row.place == std::string("root") && isAtRoot);
    return isThere && rank(Protocol::roleName(role)) >= rank(row.role);
}

void expectTruth(std::string const& what, std::optional<Right> const& right, Row const& row) {
    ASSERT_TRUE(right) << what;
    for (Role const role : Protocol::ALL_ROLES)
        for (Cover const& cover : COVERS)
            for (auto const& [nodes, isCovered] :
                 {std::pair{cover.covered, true}, std::pair{cover.others, false}})
                for (std::string const& node : nodes)
                    EXPECT_EQ(Policy::refusalOf({"office", role, cover.node}, *right, node).empty(),
                              isEnough(role, row, isCovered, cover.node == std::string()))
                        << what << " by " << Protocol::roleName(role) << " at " << cover.node << " for "
                        << node;
}

TEST(Rights, OfEachCommandAreThoseOfTheTable) {
    for (auto const& [command, row] : OF_COMMANDS)
        expectTruth("command " + std::to_string(command),
                    Policy::rightFor(static_cast<unsigned char>(command)), row);
    for (int number = 0; number < 256; ++number)
        EXPECT_EQ(Policy::rightFor(static_cast<unsigned char>(number)).has_value(),
                  OF_COMMANDS.contains(number))
            << number;
}

TEST(Rights, OfEachQuestionAreThoseOfTheTable) {
    for (auto const& [question, row] : OF_QUESTIONS)
        expectTruth(question, Policy::rightFor(question), row);
    for (std::string const& question : Policy::knownQuestions())
        EXPECT_TRUE(OF_QUESTIONS.contains(question)) << question;
    EXPECT_FALSE(Policy::rightFor(std::string("everything")));
}

TEST(Rights, ThatDoNotSufficeAreRefusedWithWhatIsMissing) {
    EXPECT_EQ(
        Policy::refusalOf({"office", Role::Read, "a=acme"}, {Role::Send, Place::Node}, "u=bob/a=acme"),
        "this needs the role send at u=bob/a=acme, and the token office has the role read at a=acme: ask "
        "for a token that may (\"vlmail token add\")");
    EXPECT_EQ(Policy::refusalOf({"office", Role::Admin, "a=acme"}, {Role::Admin, Place::Root}, "a=acme"),
              "this needs the role admin at the root, and the token office has the role admin at a=acme: ask "
              "for a token that may (\"vlmail token add\")");
    EXPECT_EQ(Policy::refusalOf({"office", Role::Read, ""}, {Role::Send, Place::Anywhere}, ""),
              "this needs the role send, and the token office has the role read at the root: ask for a token "
              "that may (\"vlmail token add\")");
    EXPECT_THAT(Policy::refusalOf({"office", Role::Read, "a=acme"}, {Role::Read, Place::Node}, "u=\n/a=x"),
                testing::Not(testing::HasSubstr("\n")));
}

TEST(Rights, AreGivenOutByNobodyBeyondHisOwnRoleOrNode) {
    for (Role const holds : Protocol::ALL_ROLES)
        for (Role const gives : Protocol::ALL_ROLES)
            for (Cover const& cover : COVERS) {
                Grant const holder{"office", holds, cover.node};
                for (std::string const& node : cover.covered)
                    EXPECT_EQ(Policy::refusalOfGranting(holder, gives, node).empty(), holds == Role::Admin);
                for (std::string const& node : cover.others)
                    EXPECT_NE(Policy::refusalOfGranting(holder, gives, node), "");
            }
}

} // namespace
