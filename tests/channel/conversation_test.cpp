// Client and service as programs use them.

#include "tests/channel/running_server.h"

#include "vlservice/ipc/cfg_ids_tree.h"
#include "vlservice/ipc/price_est.h"
#include "vlservice/ipc/remove_cfg_node.h"
#include "vlservice/ipc/update_status.h"

#include "programs/base/error.h"
#include "programs/channel/message_text.h"

#include <gmock/gmock.h>

using namespace testing;
using namespace ChannelTest;
using Channel::Client;

namespace {

class Conversation : public Test {
protected:
    SharedLog log;
    RunningServer server;

    /// The text of the Error that the operation throws.
    template<typename Operation>
    static std::string errorOf(Operation operation) {
        try {
            operation();
        } catch (Base::Error const& e) {
            return e.what();
        }
        return "no error";
    }
};

TEST_F(Conversation, BringsACommandThereAndItsAnswerBack) {
    Client client(server.clientSettings());
    auto const cmd = client.call<Ipc::PriceEst>(json::Object{{"sheets", 3}});
    EXPECT_EQ(Channel::print(cmd->resp()), R"({"asked":{"sheets":3}})");
}

TEST_F(Conversation, AnswersOneCommandAfterTheOther) {
    Client client(server.clientSettings());
    for (int i = 0; i < 100; ++i) {
        auto const cmd = client.call<Ipc::PriceEst>(json::Object{{"n", i}});
        EXPECT_EQ(Channel::print(cmd->resp()), R"({"asked":{"n":)" + std::to_string(i) + "}}");
    }
    EXPECT_EQ(server.connections(), 1u);
}

TEST_F(Conversation, CarriesTheErrorOfACommandInItsResponse) {
    Client client(server.clientSettings());
    auto const cmd = client.call<Ipc::RemoveCfgNode>(Cfg::Id("a=acme"));
    EXPECT_EQ(cmd->resp(), "There is no node a=acme.");
}

TEST_F(Conversation, TellsTheClientWhatTheHandlerThrew) {
    Client client(server.clientSettings());
    EXPECT_EQ(errorOf([&] { client.call<Ipc::UpdateStatus>("h", "n"); }),
              "The service refuses: The database is away.");
    EXPECT_TRUE(log.hasLogged("Request 21 failed: The database is away."));
    EXPECT_TRUE(log.hasLogged(
        "Command Update Status failed in transfer. The service refuses: The database is away."));
    // The connection is still good.
    client.call<Ipc::PriceEst>(json::Object{});
}

} // namespace
