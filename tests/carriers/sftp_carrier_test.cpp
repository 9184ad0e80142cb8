#include "programs/carriers/sftp_carrier.h"

#include "programs/base/read_file.h"
#include "programs/carriers/control_file.h"
#include "tests/carriers/parcel_help.h"
#include "tests/carriers/ssh_server.h"
#include "tests/support/failure_of.h"
#include "tests/support/small_disk.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <sys/socket.h>
#include <unistd.h>
#include <utility>

namespace {

namespace fs = std::filesystem;

using Carriers::Outcome;
using Carriers::SftpCarrier;
using testing::AnyOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

class SftpCarrierTest : public testing::Test {
protected:
    void SetUp() override {
        if (!SshServer::whyNot().empty())
            GTEST_SKIP() << SshServer::whyNot();
        fs::create_directory(drop_);
        fs::permissions(drop_, fs::perms(0777));
        server_.emplace(folder_ / "ssh", drop_);
    }

    Protocol::CarrierSettings settings() const {
        Protocol::CarrierSettings settings;
        settings.type = Protocol::CarrierType::Sftp;
        settings.url = server_->url();
        settings.hostKey = server_->hostKey();
        settings.identityFile = server_->identityFile().string();
        return settings;
    }
    /// "accepted", or what failed.
    static std::string handOver(SftpCarrier& carrier, Carriers::Parcel const& parcel) {
        try {
            return carrier.handOver(parcel, noRecord).kind == Outcome::Kind::Accepted ? "accepted"
                                                                                      : "not accepted";
        } catch (std::exception const& failure) {
            return failure.what();
        }
    }
    /// Whoever finds the control file finds the others, whole.
    void expectWhole(Carriers::Parcel const& parcel, std::string const& when) const {
        if (!fs::exists(drop_ / (parcel.key + ".json")))
            return;
        Carriers::forEachFile(parcel, [&](std::string const& name, std::string_view bytes, bool) {
            ASSERT_TRUE(fs::exists(drop_ / name)) << name << when;
            EXPECT_EQ(Base::readFile(drop_ / name), bytes) << name << when;
        });
    }

    TemporaryFolder folder_;
    fs::path drop_ = folder_ / "drop";
    std::optional<SshServer> server_;
};

TEST_F(SftpCarrierTest, PutsTheFilesOfTheFolderCarrierThere) {
    Carriers::Parcel const parcel = parcelOf("p1-1", {"Ada\nLong St 1"});
    SftpCarrier carrier(settings());
    Outcome const outcome = carrier.handOver(parcel, noRecord);
    EXPECT_EQ(outcome.kind, Outcome::Kind::Accepted);
    EXPECT_EQ(outcome.says, "in " + server_->url());
    EXPECT_THAT(namesIn(drop_), ElementsAre("p1-1.csv", "p1-1.json", "p1-1.pdf"));
    expectWhole(parcel, "");
}

TEST_F(SftpCarrierTest, ReplacesWhatItHandedOverBeforeUnderTheKey) {
    SftpCarrier carrier(settings());
    carrier.handOver(parcelOf("p1-1", {"Ada"}), noRecord);
    Carriers::Parcel const other = parcelOf("p1-1", {"Bert", "Eve"});
    carrier.handOver(other, noRecord);
    EXPECT_EQ(namesIn(drop_).size(), 3U);
    expectWhole(other, "");
    EXPECT_THAT(Base::readFile(drop_ / "p1-1.json"), HasSubstr("Eve"));
}

TEST_F(SftpCarrierTest, TakesEachNameAsItIs) {
    SftpCarrier carrier(settings());
    for (char const* const key : {"a b-1", "100%25-1", "say \"hi\"\\-1", "#?&-1", "\xC3\xA4-1", "it's-1"}) {
        Carriers::Parcel const parcel = parcelOf(key, {"Ada"});
        EXPECT_EQ(handOver(carrier, parcel), "accepted") << key;
        EXPECT_TRUE(fs::exists(drop_ / (std::string(key) + ".json"))) << key;
        expectWhole(parcel, key);
    }
}

TEST_F(SftpCarrierTest, LooksForAFolderWhereTheUserBegins) {
    Protocol::CarrierSettings home = settings();
    std::size_t const slash = home.url.find('/', std::string("sftp://").size());
    // Without a home the user begins where the server was started.
    home.url = home.url.substr(0, slash) + "/~" + home.url.substr(slash);
    home.url.insert(home.url.find("/~/") + 2, fs::relative("/", fs::current_path()).string().insert(0, "/"));
    SftpCarrier carrier(home);
    Carriers::Parcel const parcel = parcelOf("p1-1", {"Ada"});
    EXPECT_EQ(handOver(carrier, parcel), "accepted");
    EXPECT_EQ(namesIn(drop_).size(), 3U);
}

TEST_F(SftpCarrierTest, SaysWhatRoomThereIsAndLeavesNothing) {
    SftpCarrier carrier(settings());
    EXPECT_THAT(carrier.test(), StartsWith(server_->url() + " can be written into and has room for "));
    EXPECT_THAT(namesIn(drop_), IsEmpty());
}

TEST_F(SftpCarrierTest, PutsNothingOnAMachineWithAnotherKey) {
    Protocol::CarrierSettings other = settings();
    other.hostKey = "SHA256:" + std::string(43, 'A');
    SftpCarrier carrier(other);
    std::string const host = other.url.substr(7, other.url.find('/', 7) - 7);
    std::string const failure = handOver(carrier, parcelOf("p1-1", {"Ada"}));
    EXPECT_THAT(failure, StartsWith(host + " is not the machine with the \"host_key\" of the settings: "));
    EXPECT_THAT(failure, HasSubstr(server_->hostKey().substr(7))) << "the one that it has";
    EXPECT_THAT(namesIn(drop_), IsEmpty());
}

TEST_F(SftpCarrierTest, SaysWhoIsNotLetIn) {
    Protocol::CarrierSettings stranger = settings();
    stranger.identityFile = server_->strangersFile().string();
    SftpCarrier carrier(stranger);
    EXPECT_THAT(handOver(carrier, parcelOf("p1-1", {"Ada"})),
                StartsWith(stranger.url.substr(7, stranger.url.find('/', 7) - 7) +
                           " has let nobody in with the key in " + stranger.identityFile));
    EXPECT_THAT(namesIn(drop_), IsEmpty());
}

TEST_F(SftpCarrierTest, UsesNoKeyThatOthersMayRead) {
    fs::permissions(server_->identityFile(), fs::perms(0644));
    SftpCarrier carrier(settings());
    EXPECT_EQ(handOver(carrier, parcelOf("p1-1", {"Ada"})),
              "The file \"" + server_->identityFile().string() +
                  "\" is open to others (mode 0644); make it private with chmod 600.");
    EXPECT_EQ(server_->relay().pieces(), 0) << "before anything was sent";
}

TEST_F(SftpCarrierTest, FindsItsKeyAmongTheCredentialsOfTheService) {
    Protocol::CarrierSettings named = settings();
    named.identityFile = "user";
    ::unsetenv("CREDENTIALS_DIRECTORY");
    SftpCarrier carrier(named);
    EXPECT_EQ(failureOf([&] { carrier.test(); }),
              "the service has been handed no credentials, and so no \"user\"");
    ::setenv("CREDENTIALS_DIRECTORY", server_->identityFile().parent_path().c_str(), 1);
    EXPECT_EQ(handOver(carrier, parcelOf("p1-1", {"Ada"})), "accepted");
    ::unsetenv("CREDENTIALS_DIRECTORY");
}

TEST_F(SftpCarrierTest, FailsWhereTheFolderMayNotBeWrittenInto) {
    fs::permissions(drop_, fs::perms(0555));
    SftpCarrier carrier(settings());
    std::string const failure = handOver(carrier, parcelOf("p1-1", {"Ada"}));
    EXPECT_THAT(failure, StartsWith("nothing can be put into " + server_->url() + ": "));
    EXPECT_THAT(failure, HasSubstr("ermission denied"));
    EXPECT_EQ(failureOf([&] { carrier.test(); }), failure);
}

TEST_F(SftpCarrierTest, FailsWhereTheFolderIsGone) {
    fs::remove(drop_);
    SftpCarrier carrier(settings());
    EXPECT_THAT(handOver(carrier, parcelOf("p1-1", {"Ada"})),
                StartsWith("nothing can be put into " + server_->url() + ": "));
}

TEST_F(SftpCarrierTest, FailsWhereNobodyListens) {
    Protocol::CarrierSettings const before = settings();
    server_.reset();
    SftpCarrier carrier(before);
    EXPECT_THAT(handOver(carrier, parcelOf("p1-1", {"Ada"})),
                StartsWith("nothing can be put into " + before.url + ": "));
}

TEST_F(SftpCarrierTest, FailsWhereTheOtherSideIsNoSuchServer) {
    VLServiceTest::CuttingRelay const babbler([] {
        int ends[2];
        ::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends);
        std::string const words = "220 smtp.example ESMTP\r\n" + std::string(100'000, 'x');
        ::send(ends[1], words.data(), words.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
        ::close(ends[1]);
        return ends[0];
    });
    Protocol::CarrierSettings other = settings();
    other.url = "sftp://nobody@127.0.0.1:" + std::to_string(babbler.port()) + "/drop/";
    SftpCarrier carrier(other);
    EXPECT_THAT(handOver(carrier, parcelOf("p1-1", {"Ada"})),
                StartsWith("nothing can be put into " + other.url + ": "));
}

TEST_F(SftpCarrierTest, ConnectsAnewWhenTheConnectionWasClosedMeanwhile) {
    SftpCarrier carrier(settings());
    EXPECT_EQ(handOver(carrier, parcelOf("p1-1", {"Ada"})), "accepted");
    bool isCut = false;
    server_->relay().onPiece([&](int) { return std::exchange(isCut, true); });
    EXPECT_EQ(handOver(carrier, parcelOf("p1-2", {"Bert"})), "accepted");
    EXPECT_EQ(namesIn(drop_).size(), 6U);
}

TEST_F(SftpCarrierTest, LeavesNothingThatLooksWholeWhereverTheConnectionIsCut) {
    Carriers::Parcel parcel = parcelOf("p1-1", {"Ada"});
    parcel.document.assign(100'000, 'x');
    int cutAt = 0;
    bool isCut = false;
    do {
        std::string const when = ", cut at piece " + std::to_string(++cutAt);
        isCut = false;
        // And nobody is let in afterwards.
        server_->relay().onPiece([&](int piece) {
            isCut = isCut || piece == cutAt;
            return !isCut;
        });
        SftpCarrier carrier(settings());
        std::string const said = handOver(carrier, parcel);
        server_->relay().onPiece({});
        if (isCut && said != "accepted") {
            EXPECT_THAT(said, AnyOf(StartsWith("nothing can be put into "),
                                    HasSubstr(" has let nobody in with the key in ")))
                << when;
        }
        expectWhole(parcel, when);
        EXPECT_EQ(handOver(carrier, parcel), "accepted") << when;
        EXPECT_THAT(namesIn(drop_), ElementsAre("p1-1.csv", "p1-1.json", "p1-1.pdf")) << when;
        expectWhole(parcel, when);
        fs::remove(drop_ / "p1-1.json");
    } while (isCut && !HasFailure());
    // Greeting, keys, user, and three files that are opened, written, closed and renamed.
    EXPECT_GT(cutAt, 40);
}

TEST(SftpCarrierOnAFullDisk, FailsAndLeavesNothingThatLooksWhole) {
    if (!SshServer::whyNot().empty())
        GTEST_SKIP() << SshServer::whyNot();
    TemporaryFolder const folder;
    fs::path const drop = folder / "drop";
    fs::create_directory(drop);
    VLServiceTest::MountedDisk const disk(drop.string(), "size=64k,mode=0777");
    if (!disk.whyNot().empty())
        GTEST_SKIP() << disk.whyNot();
    SshServer server(folder / "ssh", drop);
    Protocol::CarrierSettings settings;
    settings.url = server.url();
    settings.hostKey = server.hostKey();
    settings.identityFile = server.identityFile().string();
    SftpCarrier carrier(settings);
    Carriers::Parcel parcel = parcelOf("p1-1", {"Ada"});
    parcel.document.assign(1'000'000, 'x');
    EXPECT_THAT(failureOf([&] { carrier.handOver(parcel, noRecord); }),
                StartsWith("nothing can be put into " + server.url() + ": "));
    EXPECT_FALSE(fs::exists(drop / "p1-1.pdf"));
    EXPECT_FALSE(fs::exists(drop / "p1-1.json"));
    parcel.document.assign(1000, 'x');
    EXPECT_EQ(carrier.handOver(parcel, noRecord).kind, Outcome::Kind::Accepted) << "of a size that fits";
}

} // namespace
