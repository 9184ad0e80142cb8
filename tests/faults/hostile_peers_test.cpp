// The programs, with peers that do with a connection what nobody should.
#include "tests/faults/process.h"
#include "tests/support/hostile_peers.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/service_process.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <fstream>

namespace {

namespace fs = std::filesystem;
using Faults::Ended;
using testing::HasSubstr;
using testing::StartsWith;

class HostilePeers : public testing::TestWithParam<VLServiceTest::Hostility> {
protected:
    HostilePeers() { fs::create_directory(folder_); }

    Ended askForJobs(std::uint16_t port, fs::path const& token) {
        return Faults::runWith(
            {}, VLMAIL_PROGRAM,
            {"status", "--service", "127.0.0.1:" + std::to_string(port), "--token", token.string()},
            {folder_});
    }

    TemporaryFolder root_;
    fs::path folder_ = root_ / "work";
};

TEST_P(HostilePeers, KeepNobodyFromTheService) {
    constexpr int MANY = 20;
    fs::path const data = root_ / "data";
    ServiceProcess service({"--data", data.string(), "--no-discovery"});
    {
        VLServiceTest::HostileClients const strangers(service.port(), GetParam(), MANY);
        Ended const ended = askForJobs(service.port(), data / "token");
        EXPECT_EQ(ended.status, 0) << ended.err;
        EXPECT_THAT(ended.out, HasSubstr("no such mailings"));
    }
    service.signal(SIGTERM);
    EXPECT_EQ(service.wait(), 0) << service.errors();
    EXPECT_EQ(service.errors().find_first_of("\x1b\x9b"), std::string::npos) << service.errors();
}

TEST_P(HostilePeers, GetNothingFromTheClient) {
    fs::path const token = root_ / "token";
    std::ofstream(token) << std::string(64, 'a') << '\n';
    fs::permissions(token, fs::perms::owner_read | fs::perms::owner_write);
    VLServiceTest::HostileService const service(GetParam());
    Ended const ended = askForJobs(service.port(), token);
    EXPECT_FALSE(ended.isLate);
    EXPECT_EQ(ended.status, 1) << ended.out;
    EXPECT_EQ(ended.out, "");
    EXPECT_THAT(ended.err, StartsWith("vlmail: 127.0.0.1:" + std::to_string(service.port()) + ": "));
    EXPECT_EQ(std::ranges::count(ended.err, '\n'), 1) << ended.err;
    EXPECT_EQ(ended.err.find('\x1b'), std::string::npos);
}

INSTANTIATE_TEST_SUITE_P(With, HostilePeers, testing::ValuesIn(VLServiceTest::hostilities()),
                         [](auto const& each) { return each.param.name; });

} // namespace
