#include "vlservice/platform/cmd.h"

#include "vlservice/platform/log.h"

#include "tests/support/json_literal.h"

#include <gmock/gmock.h>

#include <chrono>
#include <memory>
#include <string>
#include <type_traits>
#include <vector>

namespace {

using namespace VLServiceTest;
using namespace std::chrono_literals;
using Ipc::CmdI;
using Ipc::Timeouts;
using testing::ElementsAre;

static_assert(
    std::is_same_v<decltype(Timeouts::duration(Timeouts::TIMEOUT_ID_0)), std::chrono::milliseconds>);
static_assert(std::is_convertible_v<Timeouts::TimeoutId, int>);
static_assert(Timeouts::TIMEOUT_ID_0 == 0 && Timeouts::TIMEOUT_ID_3 == 3);
static_assert(std::is_base_of_v<std::enable_shared_from_this<CmdI>, CmdI>);
static_assert(!std::is_destructible_v<Ipc::JsonCmdBase>);

/// Takes commands in and does nothing else.
class Processor : public Ipc::CmdProcessorI {
public:
    void submit(std::shared_ptr<CmdI> cmd) override { submitted.push_back(std::move(cmd)); }
    std::vector<std::shared_ptr<CmdI>> submitted;
};

/// Sends and receives at once, and notes what was to be carried.
class Transfer : public Ipc::CmdTransferI {
public:
    void send(std::shared_ptr<CmdI> cmd, Message which, json::Object const& message,
              std::function<void()> gone) override {
        steps.push_back("send " + nameOf(which) + ' ' + cmd->name() + ' ' + text(message));
        gone();
    }
    void read(std::shared_ptr<CmdI> cmd, Message which,
              std::function<void(json::Object const&)> taken) override {
        steps.push_back("read " + nameOf(which) + ' ' + cmd->name());
        taken(json::Object{{"from", nameOf(which)}});
    }
    std::vector<std::string> steps;

private:
    static std::string nameOf(Message which) { return which == Message::Request ? "request" : "response"; }
};

class ConnectedProcessor : public Processor {
public:
    Ipc::CmdTransferI* transfer() override { return &connection; }
    Transfer connection;
};

/// Overrides no more than a command must.
class Ping : public Ipc::JsonCmdBase {
public:
    using JsonCmdBase::JsonCmdBase;
    Ping(Ping const&) = default;
    ~Ping() override = default;
    char const* name() const override { return "Ping"; }
};

/// Has a payload in both directions and notes its steps.
class Talk : public Ping {
public:
    using Ping::Ping;
    json::Object serializeReq() const override { return {{"to", "there"}}; }
    void sendReqDone() override { steps.push_back("request gone"); }
    void deserializeReq(json::Object const& request) override { steps.push_back(text(request)); }
    void readReqDone() override { steps.push_back("request read"); }
    json::Object serializeResp() const override { return {{"and", "back"}}; }
    void sendRespDone() override { steps.push_back("response gone"); }
    void deserializeResp(json::Object const& response) override { steps.push_back(text(response)); }
    void readRespDone() override { steps.push_back("response read"); }
    std::vector<std::string> steps;
};

/// The same one level up.
class Bare : public CmdI {
public:
    using CmdI::CmdI;
    ~Bare() override = default;
    char const* name() const override { return "Bare"; }
};

class Commands : public testing::Test {
protected:
    Commands() {
        before_ = Log::setSink([this](LogPriority priority, std::string const& line) {
            lines.push_back(std::to_string(priority) + " " + line);
        });
    }
    ~Commands() override { Log::setSink(before_); }

    std::vector<std::string> lines;

private:
    Log::Sink before_;
};

TEST_F(Commands, KeepTheirIdAndProcessorAlsoInACopy) {
    auto const processor = std::make_shared<Processor>();
    auto const ping = std::make_shared<Ping>(static_cast<unsigned char>(200), processor);
    EXPECT_EQ(ping->id(), 200);
    EXPECT_EQ(ping->processor(), processor);
    auto const copy = std::make_shared<Ping>(*ping);
    EXPECT_EQ(copy->id(), 200);
    EXPECT_EQ(copy->processor(), processor);
    EXPECT_EQ(copy->shared_from_this(), copy);
}

TEST_F(Commands, FallUnderTheFirstTimeoutAndLetTheNextRequestGo) {
    Ping const ping(1, nullptr);
    EXPECT_EQ(ping.reqTimeoutId(), Timeouts::TIMEOUT_ID_1);
    EXPECT_TRUE(ping.sendNextReqAfterDone());
}

TEST_F(Commands, CarryNothingUnlessTheySayWhat) {
    Ping ping(1, nullptr);
    auto& base = static_cast<Ipc::JsonCmdBase&>(ping);
    EXPECT_EQ(text(base.serializeReq()), "{}");
    EXPECT_EQ(text(base.serializeResp()), "{}");
    EXPECT_NO_THROW(base.deserializeReq(json::Object{{"x", 1}}));
    EXPECT_NO_THROW(base.deserializeResp(json::Object{{"x", 1}}));
    base.sendReqDone();
    base.readReqDone();
    base.sendRespDone();
    base.readRespDone();
}

TEST_F(Commands, TakeTheirFourStepsOverTheProcessorsConnection) {
    auto const processor = std::make_shared<ConnectedProcessor>();
    auto const talk = std::make_shared<Talk>(static_cast<unsigned char>(1), processor);
    talk->sendReq();
    talk->readReq();
    talk->sendResp();
    talk->readResp();
    EXPECT_THAT(processor->connection.steps,
                ElementsAre(R"(send request Ping {"to":"there"})", "read request Ping",
                            R"(send response Ping {"and":"back"})", "read response Ping"));
    EXPECT_THAT(talk->steps, ElementsAre("request gone", R"({"from":"request"})", "request read",
                                         "response gone", R"({"from":"response"})", "response read"));
    EXPECT_THAT(lines, ElementsAre());
}

TEST_F(Commands, LogThatThereIsNoConnection) {
    std::string const line = "4 Command Ping failed in transfer. There is no connection";
    for (auto const& processor : {std::shared_ptr<Processor>(), std::make_shared<Processor>()}) {
        lines.clear();
        auto const ping = std::make_shared<Ping>(static_cast<unsigned char>(1), processor);
        ping->sendReq();
        ping->readReq();
        ping->sendResp();
        ping->readResp();
        EXPECT_THAT(lines, ElementsAre(line, line, line, line));
    }
}

TEST_F(Commands, WithoutAFormHaveABodyForEveryOperation) {
    Bare bare(1, nullptr);
    Processor processor;
    bare.sendReq();
    bare.readReq();
    bare.sendResp();
    bare.readResp();
    bare.accept(processor);
    EXPECT_THAT(lines, testing::SizeIs(4));
}

TEST_F(Commands, LogATransferFailure) {
    Ping ping(1, nullptr);
    ping.onTransferError("Timed out");
    EXPECT_THAT(lines, ElementsAre("4 Command Ping failed in transfer. Timed out"));
}

TEST(CommandProcessor, NeedsNoMoreThanSubmit) {
    Processor processor;
    processor.submit(std::make_shared<Ping>(static_cast<unsigned char>(1), nullptr));
    EXPECT_EQ(processor.submitted.size(), 1u);
    EXPECT_EQ(processor.transfer(), nullptr);
}

TEST(CommandTimeouts, HaveTheirDurations) {
    EXPECT_EQ(Timeouts::duration(Timeouts::TIMEOUT_ID_0), 0ms);
    EXPECT_EQ(Timeouts::duration(Timeouts::TIMEOUT_ID_1), 10s);
    EXPECT_EQ(Timeouts::duration(Timeouts::TIMEOUT_ID_2), 30s);
    EXPECT_EQ(Timeouts::duration(Timeouts::TIMEOUT_ID_3), 120s);
}

} // namespace
