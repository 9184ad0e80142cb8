// The client's subcommands against a service: the command line in, text and exit status out.
#include "programs/base/read_file.h"
#include "programs/channel/data_message.h"
#include "programs/channel/token.h"
#include "programs/mailing/metadata.h"
#include "programs/protocol/pack_upload.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/mailings/pack_delivery.h"
#include "programs/vlmail/service/multicast_probe.h"
#include "programs/vlmail/service/service_client.h"
#include "tests/carriers/smtp_server.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"
#include "tests/vlserviced/letter_help.h"
#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/ipc/cs_config_ids_list.h"

#include <SQLiteCpp/Database.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <sstream>
#include <sys/wait.h>
#include <thread>

namespace {

namespace fs = std::filesystem;

using testing::HasSubstr;

class ClientCommands : public testing::Test {
protected:
    struct Result {
        int status = 0;
        std::string out;
        std::string err;
    };

    ClientCommands() { fs::create_directory(folder_ / "upload"); }

    /// Runs vlmail with the service named.
    Result vlmail(std::vector<std::string> arguments) {
        for (std::string const& more :
             {std::string("--service"), "127.0.0.1:" + std::to_string(service_.port()),
              std::string("--token"), (data_ / "token").string()})
            arguments.push_back(more);
        return run(arguments);
    }
    Result run(std::vector<std::string> const& arguments) {
        std::vector<char const*> pointers{"vlmail"};
        for (std::string const& argument : arguments)
            pointers.push_back(argument.c_str());
        std::ostringstream out;
        std::ostringstream err;
        int const status =
            VlMail::run(static_cast<int>(pointers.size()), pointers.data(), VlMail::Terminal{out, err});
        return {status, out.str(), err.str()};
    }
    /// What a run that has to succeed writes.
    std::string output(std::vector<std::string> const& arguments) {
        Result const result = vlmail(arguments);
        EXPECT_EQ(result.status, VlMail::FINE) << result.err;
        return result.out;
    }
    /// The line of a run that has to fail.
    std::string complaint(std::vector<std::string> const& arguments) {
        Result const result = vlmail(arguments);
        EXPECT_EQ(result.status, VlMail::FAILED) << result.out;
        return result.err;
    }
    std::string write(char const* name, std::string const& text) {
        std::ofstream(folder_ / name) << text;
        return (folder_ / name).string();
    }

    void awaitAccepted(std::string const& id) {
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
        while (output({"status", id}).find("accepted") == std::string::npos &&
               std::chrono::steady_clock::now() < end) {
        }
    }
    /// What a server of e-mail says of a letter.
    static std::string reportOn(std::string const& key, std::string const& action) {
        return "Content-Type: multipart/report; boundary=X\n\n--X\n\nSorry.\n--X\n"
               "Content-Type: message/delivery-status\n\nReporting-MTA: dns; mail.example\n\n"
               "Action: " +
               action +
               "\nDiagnostic-Code: smtp; 550 no such user\n\n--X\n"
               "Content-Type: text/rfc822-headers\n\nMessage-ID: <" +
               key + "@acme.example>\n\n--X--\n";
    }

    TemporaryFolder folder_;
    fs::path data_ = folder_ / "data";
    ServiceProcess service_{
        {"--data", data_.string(), "--no-discovery", "--local-packs", folder_.path().string()}};
};

/// The token in what token add prints, as a file.
class GivenTokens : public ClientCommands {
protected:
    void add(std::string const& name, std::string const& role, std::string const& node) {
        std::string const answer = output({"token", "add", name, "--role", role, "--node", node, "--json"});
        keep(name, parse(answer).get("token").toString());
    }
    void keep(std::string const& name, std::string const& token) {
        write(name.c_str(), token + '\n');
        fs::permissions(folder_ / name.c_str(), fs::perms(0600));
    }
    Result as(std::string const& name, std::vector<std::string> arguments) {
        for (std::string const& more :
             {std::string("--service"), "127.0.0.1:" + std::to_string(service_.port()),
              std::string("--token"), (folder_ / name.c_str()).string()})
            arguments.push_back(more);
        return run(arguments);
    }
    std::unique_ptr<Channel::Client> connected(std::string const& name) {
        Channel::ClientSettings settings;
        settings.host = "127.0.0.1";
        settings.port = service_.port();
        settings.token = Channel::readToken((folder_ / name.c_str()).string());
        return std::make_unique<Channel::Client>(std::move(settings));
    }
};

TEST_F(GivenTokens, AreShownOnceAndListed) {
    std::string const shown = output({"token", "add", "office", "--role", "send", "--node", "bob/acme"});
    EXPECT_THAT(shown, testing::ContainsRegex(
                           "The token office has the role send at u=bob/a=acme\\. It is shown this once:\n\n"
                           "  [0-9a-f]{16}\\.[0-9a-f]{64}\n\nWho is to have it keeps it in a file of mode "
                           "0600: ~/.config/vlmail/token, or one named with --token\\.\n"));
    std::string const list = output({"token", "list"});
    EXPECT_THAT(list, testing::ContainsRegex("\nadmin +admin +the root "));
    EXPECT_THAT(list, testing::ContainsRegex("\noffice +send +u=bob/a=acme +[0-9/]+ [0-9:]+ +admin\n"));
    EXPECT_EQ(
        complaint({"token", "add", "office", "--role", "boss", "--node", "/"}),
        "vlmail: there is no role \"boss\"; there are read, send, settings and admin [request-invalid]\n");
    EXPECT_EQ(output({"token", "revoke", "office"}),
              "The token office, which had the role send at u=bob/a=acme, is revoked.\n");
}

TEST_F(GivenTokens, AllowWhatTheirRoleSaysAtTheirNodes) {
    add("reader", "read", "a=acme");
    add("boss", "admin", "a=acme");
    EXPECT_EQ(as("reader", {"settings", "show", "a=acme", "po"}).status, VlMail::FINE);
    EXPECT_EQ(
        as("reader", {"settings", "set", "a=acme", "po", "code=R"}).err,
        "vlmail: The service refuses: this needs the role settings at a=acme, and the token reader has the "
        "role read at a=acme: ask for a token that may (\"vlmail token add\") [not-allowed]\n");
    EXPECT_EQ(as("boss", {"settings", "set", "a=acme", "po", "code=R"}).status, VlMail::FINE);
    EXPECT_THAT(as("boss", {"settings", "suspend", "jobs"}).err,
                HasSubstr("this needs the role admin at the root"));
    EXPECT_THAT(as("boss", {"token", "add", "x", "--role", "read", "--node", "a=other"}).err,
                HasSubstr("this needs the role admin at a=other"));
}

TEST_F(GivenTokens, ThatAreRevokedCountNoMoreForConnectionsThatStand) {
    add("office", "read", "a=acme");
    auto const standing = connected("office");
    json::Object const question = parse(R"({"query":"jobs"})");
    standing->call<Ipc::CSConfigIdsList>(question);
    output({"token", "revoke", "office"});
    EXPECT_THAT(failureOf([&] { standing->call<Ipc::CSConfigIdsList>(question); }),
                HasSubstr("this access token was revoked: ask for another one (\"vlmail token add\")"));
    EXPECT_THAT(failureOf([&] { connected("office"); }),
                HasSubstr("Its access token is none of this service, or was revoked."));
}

TEST_F(GivenTokens, ThatAreRevokedSendNoDataOnConnectionsThatStand) {
    add("office", "send", "a=acme");
    auto const standing = connected("office");
    SharedMemBuffer const page = zipped("a page");
    std::string const blob(reinterpret_cast<char const*>(page.data()), page.size());
    Protocol::BeginPack pack;
    pack.id = "p1";
    pack.cfgId = "a=acme";
    pack.title = "Bills";
    pack.pages = 2;
    pack.bytes = 3 * static_cast<long long>(blob.size());
    pack.sha256 = std::string(64, '0');
    VlMail::ask(*standing, pack);
    auto const send = [&](std::uint32_t position) {
        std::optional<std::string> next =
            Channel::printData({"p1", position, "bill.pdf", "1", blob.size(), 0, blob});
        standing->sendData([&] { return std::exchange(next, std::nullopt); });
    };
    send(0);
    output({"token", "revoke", "office"});
    EXPECT_THAT(failureOf([&] { send(1); }), HasSubstr("this access token was revoked"));
}

TEST_F(GivenTokens, OfTheFirstStartCanBeReplaced) {
    fs::copy_file(data_ / "token", folder_ / "first");
    EXPECT_THAT(complaint({"token", "revoke", "admin"}),
                HasSubstr("is the last one with the role admin at the "
                          "root: give out another one first"));
    add("boss", "admin", "/");
    EXPECT_EQ(as("boss", {"token", "revoke", "admin"}).status, VlMail::FINE);
    EXPECT_THAT(as("first", {"status"}).err, HasSubstr("was revoked"));
    EXPECT_EQ(as("boss", {"status"}).status, VlMail::FINE);
}

/// As files of former versions hold them.
class TokensWithoutAnId : public GivenTokens {};

TEST_F(TokensWithoutAnId, GoOnAsThoseOfAnAdministrator) {
    std::string const plain(64, 'a');
    keep("plain", plain);
    ServiceProcess const other(
        {"--data", (folder_ / "other").string(), "--no-discovery", "--token", (folder_ / "plain").string()});
    Result const listed = run({"token", "list", "--service", "127.0.0.1:" + std::to_string(other.port()),
                               "--token", (folder_ / "plain").string()});
    EXPECT_EQ(listed.out, "token  role   node      since                   given out by\n"
                          "admin  admin  the root  the service's own file\n");
}

TEST_F(GivenTokens, AreNamedInTheHistory) {
    EXPECT_THAT(output({"history"}), "nobody has changed anything there\n");
    add("boss", "admin", "a=acme");
    as("boss", {"settings", "set", "a=acme", "po", "code=R"});
    std::string const told = as("boss", {"history"}).out;
    EXPECT_THAT(told, testing::ContainsRegex("^when +who +node +what +was +is\n"));
    EXPECT_THAT(told, testing::ContainsRegex("admin +a=acme +token boss +admin\n"));
    EXPECT_THAT(told, testing::ContainsRegex("boss +a=acme +settings po +\\{\"code\":\"R\"\\}\n"));
    EXPECT_THAT(output({"history", "--node", "a=other"}), "nobody has changed anything there\n");
    EXPECT_THAT(output({"history", "--limit", "1", "--json"}),
                testing::AllOf(HasSubstr("\"who\":\"boss\""), testing::Not(HasSubstr("\"who\":\"admin\""))));
}

TEST_F(ClientCommands, SettingsImpactTellsWhatAFileWouldChange) {
    output({"settings", "set", "u=bob/a=acme", "po", "expiry=7"});
    std::string const file = write("po.json", R"({"code":"R","expiry":5})");
    EXPECT_EQ(output({"settings", "impact", "a=acme", "po", file}),
              "node          would have other values of\n"
              "a=acme        code\n"
              "a=acme        expiry\n"
              "u=bob/a=acme  code\n");
    EXPECT_EQ(output({"settings", "impact", "a=acme", "po", write("none.json", "{}")}),
              "nothing would have another value\n");
    EXPECT_EQ(output({"settings", "impact", "a=acme", "po", file, "--json"}),
              R"({"nodes":[{"id":"a=acme","keys":["code","expiry"]},{"id":"u=bob/a=acme","keys":["code"]}]})"
              "\n");
}

TEST_F(ClientCommands, CarriersAreSetListedAndTried) {
    std::string const shop = (folder_ / "shop").string();
    std::string const file =
        write("carriers.json", R"({"postal":{"type":"folder","folder":")" + shop + "\"}}");
    EXPECT_EQ(output({"carriers", "list"}),
              "the service has no carriers: \"vlmail settings service carriers=FILE\" sets some\n");
    Result const set = vlmail({"settings", "service", "carriers=" + file});
    EXPECT_EQ(set.status, VlMail::FINE);
    EXPECT_EQ(set.err, "vlmail: the carrier of postal is set and cannot be had yet: cannot open " + shop +
                           ": No such file or directory [carrier-unavailable]\n");
    EXPECT_EQ(complaint({"carriers", "test", "postal"}),
              "vlmail: cannot open " + shop + ": No such file or directory [carrier-unavailable]\n");
    fs::create_directory(shop);
    EXPECT_EQ(complaint({"carriers", "test", "postal"}),
              "vlmail: the folder " + shop +
                  " could not be had when it was set: set \"carriers\" once more [carrier-unavailable]\n");
    EXPECT_EQ(output({"settings", "service", "carriers=" + file}), "");
    EXPECT_THAT(output({"carriers", "test", "postal"}),
                HasSubstr(shop + " can be written into and has room for "));
    EXPECT_EQ(output({"carriers", "list"}), "channel  type    state    since  waiting  uncertain  note\n"
                                            "postal   folder  working               0          0\n");
    EXPECT_THAT(output({"carriers", "pause", "postal"}), HasSubstr("postal   folder  paused"));
    EXPECT_THAT(output({"carriers", "resume", "postal", "--json"}), HasSubstr(R"("state":"working")"));
    EXPECT_EQ(complaint({"carriers", "pause", "fax"}),
              "vlmail: there is no carrier of fax: \"vlmail carriers list\" shows those that there are "
              "[carrier-unknown]\n");
    EXPECT_THAT(complaint({"settings", "service", R"(carriers={"postal":{"type":"pigeon"}})"}),
                HasSubstr("the carrier of postal: \"type\" of a carrier has to be one of folder, sftp, "
                          "printer, command, smtp"));
}

TEST_F(ClientCommands, TheDoctorFindsAllWell) {
    output({"settings", "service", "upload_folder=" + (folder_ / "upload").string()});
    std::string const table = output({"doctor"});
    EXPECT_THAT(table, HasSubstr("check          state  what there is\n"
                                 "service        well   is named: 127.0.0.1:"));
    EXPECT_THAT(table, HasSubstr("\nconnection     well   is let in\n"
                                 "clock          well   the service's agrees with this one\n"
                                 "database       well   " +
                                 (data_ / "service.db").string() + " takes changes\n"));
    EXPECT_EQ(table.find("remedy"), std::string::npos) << table;
    EXPECT_THAT(output({"doctor", "--json"}),
                HasSubstr(R"({"name":"connection","state":"well","says":"is let in","remedy":""})"));
}

TEST_F(ClientCommands, TheDoctorSaysWhatHelps) {
    fs::create_directory(folder_ / "shop");
    output({"settings", "service",
            R"(carriers={"postal":{"type":"folder","folder":")" + (folder_ / "shop").string() + "\"}}"});
    EXPECT_THAT(output({"doctor"}), HasSubstr("\ncarrier postal, tried  well   "));
    output({"carriers", "pause", "postal"});
    Result const paused = vlmail({"doctor"});
    EXPECT_EQ(paused.status, VlMail::INCOMPLETE);
    EXPECT_THAT(paused.out,
                HasSubstr("\nremedy for carrier postal: \"vlmail carriers resume postal\" lets it go on\n"));
    output({"carriers", "resume", "postal"});
    fs::remove_all(folder_ / "shop");
    Result const gone = vlmail({"doctor"});
    EXPECT_EQ(gone.status, VlMail::FAILED);
    EXPECT_THAT(gone.out, HasSubstr("\ncarrier postal, tried  bad    there is no folder " +
                                    (folder_ / "shop").string() + ": No such file or directory\n"));
    EXPECT_THAT(
        gone.out,
        HasSubstr("\nremedy for carrier postal, tried: \"vlmail settings service\" shows how it is set\n"));
}

TEST_F(GivenTokens, LetTheDoctorDoubtWhatTheyMayNotAsk) {
    add("reader", "read", "a=acme");
    Result const reader = as("reader", {"doctor"});
    EXPECT_EQ(reader.status, VlMail::INCOMPLETE) << reader.out;
    EXPECT_THAT(reader.out, HasSubstr("\nconnection  well      is let in\nhealth      doubtful  "));
}

TEST_F(ClientCommands, TheDoctorEndsWhereNothingFurtherCanBeHad) {
    Result const stranger = run({"doctor", "--service", "127.0.0.1:" + std::to_string(service_.port()),
                                 "--token", write("wrong", std::string(64, 'x'))});
    EXPECT_EQ(stranger.status, VlMail::FAILED);
    EXPECT_THAT(stranger.out, HasSubstr("\nconnection  bad    "));
    EXPECT_THAT(
        stranger.out,
        HasSubstr("\nremedy for connection: see that the service runs there, and that the token is one "
                  "of its own (--token FILE)\n"));
    EXPECT_EQ(stranger.out.find("clock"), std::string::npos);
}

TEST_F(ClientCommands, LettersAreShownWhereTheyAre) {
    fs::create_directory(folder_ / "shop");
    output({"settings", "service",
            R"(carriers={"postal":{"type":"folder","folder":")" + (folder_ / "shop").string() + "\"}}"});
    storeLetters(folder_ / "packs.db", "p1", {"postal", "email"});
    output({"resume", "p1", "--database", (folder_ / "packs.db").string(), "--upload"});
    auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    std::string shown;
    do {
        shown = output({"status", "p1"});
    } while (shown.find("accepted") == std::string::npos && std::chrono::steady_clock::now() < end);
    EXPECT_THAT(shown, HasSubstr("\nmailing  letter  channel  state     since                note\n"
                                 "p1            1  postal   accepted  "));
    EXPECT_THAT(shown, HasSubstr("\np1            2  email    waiting   "));
    EXPECT_THAT(output({"status", "--json"}),
                HasSubstr(R"("letters":[{"number":1,"key":"p1-1","channel":"postal",)"
                          R"("state":"accepted","says":"in )"));
    EXPECT_EQ(complaint({"settle", "p1", "1", "failed"}),
              "vlmail: letter 1 of mailing p1 is accepted: only one that is uncertain can be settled "
              "[state-refused]\n");
    EXPECT_EQ(complaint({"settle", "p1", "1", "lost"}),
              "vlmail: a letter is settled as delivered or failed, not as \"lost\" [usage]\n");
    EXPECT_EQ(complaint({"resend", "p1", "one"}),
              "vlmail: \"one\" is no number of a letter: vlmail status MAILING shows them [usage]\n");
    EXPECT_EQ(complaint({"resend", "p1", "3"}),
              "vlmail: there is no letter 3 of mailing p1 [letter-unknown]\n");
}

TEST_F(ClientCommands, LettersAreShownWithTheChannelsThatTheyFailedByAndWhetherTheyGoByThemselves) {
    fs::create_directory(folder_ / "shop");
    output({"settings", "service",
            R"(carriers={"postal":{"type":"folder","unit":"mailing","folder":")" +
                (folder_ / "shop").string() + R"("},"email":{"type":"command","program":"/bin/true"}})"});
    // What waits for it keeps the mailing's pages.
    output({"carriers", "pause", "email"});
    storeLetters(folder_ / "packs.db", "p1", {"postal", "postal", "email"});
    output({"resume", "p1", "--database", (folder_ / "packs.db").string(), "--upload"});
    std::string shown;
    auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    do
        shown = output({"status", "p1"});
    while (shown.find(" 2  postal   accepted") == std::string::npos &&
           std::chrono::steady_clock::now() < end);
    {
        // As another side would have it.
        SQLite::Database database((data_ / "service.db").string(), SQLite::OPEN_READWRITE);
        database.setBusyTimeout(10'000);
        database.exec("UPDATE letters SET tried = 'email fax' WHERE number = 1");
        database.exec("UPDATE letters SET state = 'failed' WHERE number = 2");
    }
    output({"resend", "p1", "2"});
    do
        shown = output({"status", "p1"});
    while (shown.find("goes by itself; in ") == std::string::npos && std::chrono::steady_clock::now() < end);
    std::string const folder = (folder_ / "shop").string();
    EXPECT_THAT(shown,
                testing::ContainsRegex("\np1 +1  postal +accepted  .*  failed by email, fax; in " + folder));
    EXPECT_THAT(shown, testing::ContainsRegex("\np1 +2  postal +accepted  .*  goes by itself; in " + folder));
}

TEST_F(ClientCommands, ReportsOfEMailsAreTakenFromAMailbox) {
    VLServiceTest::SmtpServer const server(folder_ / "mails", {});
    if (!server.missing().empty())
        GTEST_SKIP() << server.missing();
    output({"settings", "service",
            R"(carriers={"email":{"type":"smtp","starttls":false,"url":")" + server.url() +
                R"(","from":"bills@acme.example","to":"{key}@example.com","subject":"Letter"}})"});
    EXPECT_EQ(output({"carriers", "test", "email"}),
              server.url() + " offers SIZE 1073741824, 8BITMIME, HELP\n");
    storeLetters(folder_ / "packs.db", "p1", {"email"});
    output({"resume", "p1", "--database", (folder_ / "packs.db").string(), "--upload"});
    awaitAccepted("p1");
    fs::path const mailbox = folder_ / "mailbox";
    fs::create_directories(mailbox / "new");
    EXPECT_EQ(complaint({"bounce", "--maildir", mailbox.string()}),
              "vlmail: " + mailbox.string() +
                  " is no mailbox (Maildir) with the folders new and cur [file-unsuitable]\n");
    fs::create_directories(mailbox / "cur");
    std::ofstream(mailbox / "new" / "1.a") << "Subject: hello\n\nyou\n";
    std::ofstream(mailbox / "new" / "2.b") << reportOn("p1-1", "failed");
    Result const taken = vlmail({"bounce", "--maildir", mailbox.string()});
    EXPECT_EQ(taken.status, VlMail::INCOMPLETE);
    EXPECT_EQ(taken.out, "p1-1, returned: 550 no such user\n");
    EXPECT_EQ(taken.err, "vlmail: 1.a: the message is no report of a server of e-mail (multipart/report) "
                         "[report-unreadable]\n");
    EXPECT_TRUE(fs::exists(mailbox / "new" / "1.a"));
    EXPECT_TRUE(fs::exists(mailbox / "cur" / "2.b:2,S"));
    EXPECT_THAT(vlmail({"status", "p1"}).out, HasSubstr("returned"));
}

/// As a mail server's aliases have it.
TEST_F(ClientCommands, ReportsOfEMailsAreTakenFromAPipe) {
    VLServiceTest::SmtpServer const server(folder_ / "mails", {});
    if (!server.missing().empty())
        GTEST_SKIP() << server.missing();
    output({"settings", "service",
            R"(carriers={"email":{"type":"smtp","starttls":false,"url":")" + server.url() +
                R"(","from":"bills@acme.example","to":"{key}@example.com","subject":"Letter"}})"});
    storeLetters(folder_ / "packs.db", "p1", {"email"});
    output({"resume", "p1", "--database", (folder_ / "packs.db").string(), "--upload"});
    awaitAccepted("p1");
    auto const bounce = [&](std::string const& message, std::string const& more = "") {
        write("message", message);
        std::string const command =
            "cat '" + (folder_ / "message").string() +
            "' | '" VLMAIL_PROGRAM "' bounce --service 127.0.0.1:" + std::to_string(service_.port()) +
            " --token '" + (data_ / "token").string() + "' " + more + " >'" + (folder_ / "told").string() +
            "' 2>&1";
        int const status = std::system(command.c_str());
        return std::to_string(WEXITSTATUS(status)) + ' ' + Base::readFile(folder_ / "told");
    };
    EXPECT_EQ(
        bounce("Subject: hello\n\nyou\n"),
        "1 vlmail: the message is no report of a server of e-mail (multipart/report) [report-unreadable]\n");
    EXPECT_EQ(
        bounce(""),
        "1 vlmail: the message is no report of a server of e-mail (multipart/report) [report-unreadable]\n");
    EXPECT_EQ(bounce(reportOn("p2-1", "failed")), "1 vlmail: there is no mailing p2 [mailing-unknown]\n");
    EXPECT_EQ(bounce(reportOn("p1-1", "delivered")), "0 p1-1, delivered: 550 no such user\n");
    EXPECT_THAT(
        bounce(reportOn("p1-1", "failed"), "--json"),
        HasSubstr(R"(0 {"id":"p1","letter":{"number":1,"key":"p1-1","channel":"email","state":"returned",)"));
}

TEST_F(ClientCommands, SettingsAreSetAndShownWithTheirOrigin) {
    EXPECT_EQ(output({"settings", "set", "/", "po", "code=R-1"}), "");
    EXPECT_EQ(output({"settings", "set", "bob/sales/acme", "po", "expiry=1900000000"}), "");
    EXPECT_EQ(output({"settings", "show", "u=bob/ou=sales/a=acme", "po", "--origin"}),
              "part  setting  value       from\n"
              "po    code     R-1         root\n"
              "po    expiry   1900000000  u=bob/ou=sales/a=acme\n");
    EXPECT_EQ(output({"settings", "show", "ou=sales/a=acme", "po", "--origin"}),
              "part  setting  value  from\n"
              "po    code     R-1    root\n"
              "po    expiry   0      built in\n");
}

TEST_F(ClientCommands, ANodeThatIsNotThereInheritsEverything) {
    EXPECT_EQ(output({"settings", "show", "u=eve/a=acme", "po"}),
              "part  setting  value\n"
              "po    code\n"
              "po    expiry   0\n"
              "u=eve/a=acme has no settings yet: all of this is inherited\n");
}

TEST_F(ClientCommands, ListsAreShownElementByElement) {
    output({"settings", "set", "/", "profiles", R"(vals=[{"name":"Root's"}])"});
    output({"settings", "set", "a=acme", "profiles", R"(vals=[{"name":"Ours"}])"});
    EXPECT_EQ(output({"settings", "show", "a=acme", "profiles", "--origin"}),
              "part      setting  value              from\n"
              "profiles  vals[0]  {\"name\":\"Ours\"}    a=acme\n"
              "profiles  vals[1]  {\"name\":\"Root's\"}  root\n");
}

TEST_F(ClientCommands, AllPartsAreShownUnlessSomeAreNamed) {
    std::string const text = output({"settings", "show", "/", "--json"});
    json::Object const parts = parse(text).get("parts").toObject();
    for (char const* part : {"app", "inet", "po", "deps", "profiles", "presets"})
        EXPECT_TRUE(parts.get(part)) << part;
}

TEST_F(ClientCommands, ASetChangesTheKeysThatItNamesAlone) {
    output({"settings", "set", "a=acme", "app", "max_letter_sheets=20", "descr=Acme Ltd"});
    output({"settings", "set", "a=acme", "app", "max_letter_sheets=30", "enforce_po=true"});
    std::string const text = output({"settings", "show", "a=acme", "app", "--json"});
    EXPECT_THAT(text, HasSubstr(R"("own":{"descr":"Acme Ltd","max_letter_sheets":30,"enforce_po":true})"));
}

TEST_F(ClientCommands, AFileReplacesAPart) {
    output({"settings", "set", "a=acme", "po", "code=A", "expiry=5"});
    output({"settings", "set", "a=acme", "po", write("po.json", R"({"code":"B"})")});
    EXPECT_THAT(output({"settings", "show", "a=acme", "po", "--json"}), HasSubstr(R"("own":{"code":"B"})"));
}

TEST_F(ClientCommands, AFileMayBeNamedAfterItsNodeWhereNoKeyOfThePartIsCalledLikeThat) {
    std::string const file = write("a=acme.json", R"({"code":"B"})");
    output({"settings", "set", "a=acme", "po", file});
    EXPECT_THAT(output({"settings", "show", "a=acme", "po", "--json"}), HasSubstr(R"("own":{"code":"B"})"));
    fs::path const before = fs::current_path();
    fs::current_path(fs::path(file).parent_path());
    write("code=C", R"({"code":"no"})");
    output({"settings", "set", "a=acme", "po", "code=C"});
    EXPECT_THAT(output({"settings", "show", "a=acme", "po", "--json"}), HasSubstr(R"("own":{"code":"C"})"));
    output({"settings", "set", "a=acme", "po", "./code=C"});
    EXPECT_THAT(output({"settings", "show", "a=acme", "po", "--json"}), HasSubstr(R"("own":{"code":"no"})"));
    fs::current_path(before);
}

TEST_F(ClientCommands, AFileWithSettingsOfANodeGivesThePartThatIsNamed) {
    std::string const file = write("node.json", R"({"po":{"code":"C"},"app":{"descr":"x"}})");
    output({"settings", "set", "a=acme", "po", file});
    EXPECT_EQ(output({"settings", "impact", "a=acme", "po", file}), "nothing would have another value\n");
    std::string const own = output({"settings", "show", "a=acme", "po", "app", "--json"});
    EXPECT_THAT(own, HasSubstr(R"("po":{"own":{"code":"C"})"));
    EXPECT_THAT(own, HasSubstr(R"("app":{"own":{})"));
    EXPECT_EQ(output({"settings", "impact", "a=acme", "po", write("other.json", R"({"po":{"code":"D"}})")}),
              "node    would have other values of\na=acme  code\n");
}

TEST_F(ClientCommands, AResetLetsTheNodeInheritAgain) {
    output({"settings", "set", "a=acme", "po", "code=A", "expiry=5"});
    output({"settings", "set", "a=acme", "app", "descr=x"});
    output({"settings", "reset", "a=acme", "po", "code"});
    EXPECT_THAT(output({"settings", "show", "a=acme", "po", "--json"}), HasSubstr(R"("own":{"expiry":5})"));
    output({"settings", "reset", "a=acme", "po"});
    EXPECT_THAT(output({"settings", "show", "a=acme", "--json"}), HasSubstr(R"("own":{"descr":"x"})"));
    output({"settings", "reset", "a=acme"});
    EXPECT_THAT(output({"settings", "show", "a=acme", "--json"}),
                testing::Not(HasSubstr(R"("own":{"descr")")));
    output({"settings", "set", "/", "po", "code=R"});
    output({"settings", "reset", "/"});
    EXPECT_THAT(output({"settings", "show", "/", "po", "--json"}), HasSubstr(R"("own":{})"));
}

TEST_F(ClientCommands, WhatCannotBeSetIsToldInOneLine) {
    struct {
        std::vector<std::string> arguments;
        std::string line;
    } const cases[] = {
        {{"settings", "set", "a=acme", "po", "kode=A"},
         "vlmail: the part \"po\" has no setting \"kode\"; it has code, expiry [setting-unknown]\n"},
        {{"settings", "set", "a=acme", "po", "expiry=soon"},
         "vlmail: \"expiry\" wants a value in JSON like 0, and \"soon\" is none [setting-invalid]\n"},
        {{"settings", "set", "a=acme", "po", "expiry=\"5\""},
         "vlmail: JSON error: Wrong type: string. Expected type: integer [json-malformed]\n"},
        {{"settings", "set", "a=acme", "pos", "code=A"},
         "vlmail: there are no settings \"pos\"; there are app, inet, po, deps, profiles, presets "
         "[setting-unknown]\n"},
        {{"settings", "set", "a=acme", "po", "code=A", "B"},
         "vlmail: \"B\" is neither the only argument, a file, nor KEY=VALUE [usage]\n"},
        {{"settings", "set", "a=acme", "po", "/missing.json"},
         "vlmail: /missing.json: there is no such file; check the name [file-unreadable]\n"},
        {{"settings", "remove", "a=acme"}, "vlmail: there is no node a=acme [node-unknown]\n"},
        {{"settings", "remove", "/"}, "vlmail: the root cannot be removed [node-in-use]\n"},
    };
    for (auto const& [arguments, line] : cases)
        EXPECT_EQ(complaint(arguments), line);
}

TEST_F(ClientCommands, NodesAreShownAsATreeAndRemovedFromBelow) {
    output({"settings", "set", "u=bob/a=acme", "po", "code=A"});
    output({"settings", "set", "a=acme", "app", "descr=Acme Ltd"});
    output({"settings", "service", R"(disabled=["u=bob/a=acme"])"});
    EXPECT_EQ(output({"settings", "tree"}), "node              description  state     own settings\n"
                                            "/\n"
                                            "  a=acme          Acme Ltd               app\n"
                                            "    u=bob/a=acme               disabled  po\n");
    EXPECT_EQ(output({"settings", "ids", "bob"}), "node          description  state\n"
                                                  "a=acme        Acme Ltd\n"
                                                  "u=bob/a=acme               disabled\n");
    EXPECT_EQ(
        complaint({"settings", "remove", "a=acme"}),
        "vlmail: node a=acme has 1 child (u=bob/a=acme): remove what is below it first [node-in-use]\n");
    output({"settings", "remove", "u=bob/a=acme"});
    output({"settings", "remove", "a=acme"});
    EXPECT_EQ(output({"settings", "tree", "--json"}),
              "{\"id\":\"\",\"descr\":\"\",\"parts\":[],\"children\":[]}\n");
}

TEST_F(ClientCommands, PricesFollowTheTariff) {
    EXPECT_EQ(complaint({"price", "3"}),
              "vlmail: the service has no tariff yet: set one with \"vlmail settings "
              "service tariff=FILE\" [setting-missing]\n");
    output(
        {"settings", "service",
         "tariff=" + write("tariff.json", R"({"currency":"EUR","letter":85,"sheet":10,"duplex_sheet":-3})")});
    EXPECT_EQ(output({"price", "20x3", "1", "--duplex"}), "letters  channel  pages each  sheets each    EUR\n"
                                                          "     20                    3            2  20.40\n"
                                                          "      1                    1            1   0.95\n"
                                                          "in all 21.35 EUR\n");
    output({"settings", "service",
            R"(tariff={"currency":"EUR","letter":85,"sheet":10,"channels":{"email":{"letter":5}}})"});
    EXPECT_EQ(output({"price", "20x3", "--channel", "email"}),
              "letters  channel  pages each  sheets each   EUR\n"
              "     20  email             3            3  1.00\n"
              "in all 1.00 EUR\n");
    EXPECT_THAT(output({"price", "3", "--channel", "postal"}), HasSubstr("in all 1.15 EUR\n"));
    EXPECT_EQ(output({"price", "3", "--json"}),
              "{\"currency\":\"EUR\",\"total\":115,\"letters\":[{\"sheets\":3,\"price\":115}]}\n");
    EXPECT_EQ(complaint({"price", "0x3"}),
              "vlmail: cannot estimate \"0x3\": it is neither a mailing file nor a "
              "number of letters and pages like 20x3 [usage]\n");
}

TEST_F(ClientCommands, AMailingIsSentHandedOnAndFollowed) {
    fs::path const database = folder_ / "packs.db";
    storePack(database, "p1");
    output({"settings", "service", "upload_folder=" + (folder_ / "upload").string()});
    {
        auto const client = clientOf(service_, data_);
        VlMail::sendPack(*client, database, "p1", false);
        EXPECT_EQ(VlMail::awaitJob(*client, "p1", std::chrono::seconds(60)).state,
                  Protocol::JobState::Queued);
        EXPECT_EQ(failureOf([&] { VlMail::awaitJob(*client, "p2", std::chrono::seconds(60)); }),
                  "the service has no job of pack p2; send it again");
    }
    EXPECT_THAT(output({"status"}), HasSubstr("p1       queued"));
    EXPECT_THAT(output({"status"}), HasSubstr("Title of p1"));
    EXPECT_EQ(output({"status", "p2"}), "the service has no such mailings\n");
    EXPECT_EQ(output({"upload", "--database", database.string()}), "");
    while (output({"status", "p1", "--json"}).find(R"("state":"submitted")") == std::string::npos)
        std::this_thread::yield();
    EXPECT_EQ(contentOf(folder_.path() / "upload" / "p1.mailing"), contentOfPack("p1"));
    fs::remove(folder_.path() / "upload" / "p1.mailing");
    EXPECT_THAT(output({"status", "--update", "--database", database.string()}),
                HasSubstr("p1       lodged"));
    std::ofstream(folder_.path() / "upload" / "p1.mailing.status")
        << R"({"state":"failed","text":"no street"})";
    EXPECT_EQ(vlmail({"status", "--update"}).status, VlMail::INCOMPLETE);
    EXPECT_THAT(vlmail({"status"}).out, HasSubstr("the carrier: no street"));
}

TEST_F(ClientCommands, AMailingIsSentOverANewConnectionWhenTheOldOneBreaks) {
    fs::path const database = folder_ / "packs.db";
    storePack(database, "p1");
    ServiceProcess* service = &service_;
    VlMail::ServiceLine line([&] { return clientOf(*service, data_); });
    service_.signal(SIGKILL);
    service_.wait();
    ServiceProcess next({"--data", data_.string(), "--no-discovery"});
    service = &next;
    EXPECT_EQ(VlMail::deliverPack(line, database, "p1", false).state, Protocol::JobState::Queued);
    EXPECT_EQ(contentOf(data_ / "outbox" / "p1.mailing"), contentOfPack("p1"));
    EXPECT_TRUE(Mailing::finishedPacks(database).empty()) << "it stays with the client";
}

TEST_F(ClientCommands, AMailingThatCannotBeSentIsNamedWithWhatCanBeDone) {
    fs::path const database = folder_ / "packs.db";
    storePack(database, "p1");
    VlMail::ServiceLine line([this] { return clientOf(service_, data_); }, {.time = {}, .pause = {}});
    service_.signal(SIGKILL);
    service_.wait();
    std::string const text = failureOf([&] { VlMail::deliverPack(line, database, "p1", false); });
    EXPECT_THAT(text, testing::StartsWith("mailing p1: "));
    EXPECT_THAT(text, testing::EndsWith("; \"vlmail status p1\" tells what the service knows of it, \"vlmail "
                                        "resume p1\" sends it again, never twice, and \"vlmail discard p1\" "
                                        "erases it"));
    EXPECT_EQ(Mailing::finishedPacks(database).size(), 1u);
}

TEST_F(ClientCommands, WhatTheServiceRefusesIsNotRepeated) {
    fs::path const database = folder_ / "packs.db";
    storePack(database, "p1", "acme");
    int connections = 0;
    VlMail::ServiceLine line([&] {
        ++connections;
        return clientOf(service_, data_);
    });
    EXPECT_THAT(failureOf([&] { VlMail::deliverPack(line, database, "p1", false); }),
                HasSubstr("mailing p1: node id \"acme\" is not valid"));
    EXPECT_EQ(connections, 1);
}

TEST_F(ClientCommands, StrandedMailingsAreListedResumedAndDiscarded) {
    fs::path const database = folder_ / "packs.db";
    for (char const* id : {"p1", "p2", "p3"})
        storePack(database, id);
    std::string const file = database.string();
    EXPECT_EQ(output({"resume", "p1", "--database", file}), "p1, queued\n");
    Result const stranded = vlmail({"status", "--stranded", "--database", file});
    EXPECT_EQ(stranded.status, VlMail::INCOMPLETE);
    EXPECT_THAT(stranded.out, HasSubstr("p2 "));
    EXPECT_THAT(stranded.out, HasSubstr("  Title of p3\n"));
    EXPECT_THAT(stranded.out, testing::Not(HasSubstr("p1 ")));
    output({"discard", "p2", "--database", file});
    EXPECT_THAT(vlmail({"status", "--stranded", "--json", "--database", file}).out,
                testing::StartsWith("{\"stranded\":[{\"id\":\"p3\",\"title\":\"Title of "
                                    "p3\",\"cfg_id\":\"a=acme\",\"created\":"));
    EXPECT_EQ(
        complaint({"discard", "p2", "--database", file}),
        "vlmail: the pack database " + file +
            " has no mailing p2; \"vlmail status --stranded\" lists those that it has [mailing-unknown]\n");
    output({"discard", "p3", "--database", file});
    EXPECT_EQ(output({"status", "--stranded", "--database", file}), "no mailing is stranded\n");
    EXPECT_EQ(output({"status", "p2"}), "the service has no such mailings\n");
}

TEST_F(ClientCommands, AMailingThatTheServiceIsAboutToFetchIsNotDiscarded) {
    fs::path const database = folder_ / "packs.db";
    storePack(database, "p1");
    output({"settings", "suspend", "jobs"});
    {
        auto const client = clientOf(service_, data_);
        VlMail::sendPack(*client, database, "p1", false);
    }
    EXPECT_EQ(complaint({"discard", "p1", "--database", database.string()}),
              "vlmail: the service is about to fetch mailing p1 and its letters will go out: it cannot be "
              "discarded [state-refused]\n");
    EXPECT_EQ(output({"status", "--stranded", "--database", database.string()}), "no mailing is stranded\n");
    EXPECT_EQ(Mailing::finishedPacks(database).size(), 1u);
}

TEST_F(ClientCommands, ThePackDatabaseNeverLeavesItsFolder) {
    auto const client = clientOf(service_, data_);
    output({"settings", "set", "a=acme", "app", "db_host=/srv/packs", "db_name=../../etc/packs.db"});
    EXPECT_EQ(failureOf([&] { VlMail::packDatabaseOf(*client, "a=acme"); }),
              "the setting \"db_name\" of node \"a=acme\" has to be the name of a file, and "
              "\"../../etc/packs.db\" is none");
}

TEST_F(ClientCommands, ThePackDatabaseIsThatOfTheNodesSettings) {
    auto const client = clientOf(service_, data_);
    ::setenv("XDG_DATA_HOME", folder_.path().c_str(), 1);
    EXPECT_EQ(VlMail::packDatabaseOf(*client, "a=acme"), folder_ / "vlmail/packs.db");
    output({"settings", "set", "a=acme", "app", "db_host=/srv/packs", "db_name=acme.db"});
    EXPECT_EQ(VlMail::packDatabaseOf(*client, "u=bob/a=acme"), "/srv/packs/acme.db");
    ::unsetenv("XDG_DATA_HOME");
}

TEST_F(ClientCommands, ChangesAndJobsAreHeldBack) {
    output({"settings", "suspend", "settings"});
    EXPECT_EQ(complaint({"settings", "set", "a=acme", "po", "code=A"}),
              "vlmail: changes of settings are held back at the moment [service-suspended]\n");
    output({"settings", "suspend", "nothing"});
    output({"settings", "set", "a=acme", "po", "code=A"});
    EXPECT_EQ(complaint({"settings", "suspend", "me"}),
              "vlmail: \"me\" cannot be held back; name settings, jobs, all or nothing [usage]\n");
}

TEST_F(ClientCommands, TheServicesSettingsAreShown) {
    output({"settings", "service", "upload_folder=" + (folder_ / "upload").string()});
    EXPECT_EQ(output({"settings", "service"}), "setting        value\n"
                                               "upload_folder  " +
                                                   (folder_ / "upload").string() +
                                                   "\n"
                                                   "outbox         " +
                                                   (data_ / "outbox").string() +
                                                   "\n"
                                                   "jobs           {}\n");
    output({"settings", "service", "upload_folder="});
    EXPECT_THAT(output({"settings", "service", "--json"}), testing::StartsWith("{\"outbox\":"));
    EXPECT_EQ(complaint({"settings", "service", "colour=red"}),
              "vlmail: \"colour=red\" sets nothing; write upload_folder=PATH, tariff=FILE, carriers=FILE, "
              "disabled=[...], quota={...} or retention_days=N [usage]\n");
}

TEST_F(ClientCommands, DiscoverTellsWhetherTheNamedServiceCanBeUsed) {
    Result const found = vlmail({"discover"});
    EXPECT_EQ(found.status, VlMail::FINE);
    EXPECT_THAT(found.out, HasSubstr("127.0.0.1:" + std::to_string(service_.port()) + "  ok"));
    Result const stranger =
        run({"discover", "--json", "--service", "127.0.0.1:" + std::to_string(service_.port()), "--token",
             write("token", std::string(40, 'x'))});
    EXPECT_EQ(stranger.status, VlMail::INCOMPLETE);
    EXPECT_THAT(stranger.out, testing::Not(HasSubstr(R"("connection":"ok")")));
}

/// Mails to the service what the settings of a node say.
class MailingsOfANode : public GivenTokens {
protected:
    MailingsOfANode() {
        output({"settings", "service", "upload_folder=" + upload_.string()});
        output({"settings", "set", "/", "app", "db_host=" + folder_.path().string()});
        setPackPreset("");
        letter_ = write("a.txt", "To: Ada\n");
    }

    /// Keys of the pack preset, such as R"("duplex": true)".
    void setPackPreset(std::string const& keys) {
        output(
            {"settings", "set", "a=acme", "presets",
             write("presets.json",
                   R"({"extract_presets": [{"match": ".*", "pack_preset": "Bills", "zones": [)"
                   R"({"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, )"
                   R"("fields": [{"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, )"
                   R"("send_to_server": true}]}]}], "pack_presets": [{"name": "Bills", "title": "Bills")" +
                       (keys.empty() ? "" : ", " + keys) + "}]}")});
    }
    /// Mails a letter that nobody had before; the mailing's id.
    std::string mail(std::vector<std::string> const& more = {}) {
        write("a.txt", "To: Ada\nLetter " + std::to_string(++letters_) + '\n');
        std::vector<std::string> arguments{"mail", "--send", "--node", "u=bob/a=acme", "--json", letter_};
        arguments.insert(arguments.end(), more.begin(), more.end());
        json::Object const mailed = parse(output(arguments));
        return mailed.get("mailings").toArray().at(0).toObject().get("id").textOrEmpty();
    }
    json::Object jobOf(std::string const& id) {
        json::Object const answer = parse(vlmail({"status", id, "--json"}).out);
        return answer.get("jobs").toArray().at(0).toObject();
    }
    std::string stateOf(std::string const& id) { return jobOf(id).get("state").textOrEmpty(); }
    void awaitState(std::string const& id, std::string const& state) {
        while (stateOf(id) != state)
            std::this_thread::yield();
    }
    bool isHandedOver(std::string const& id) const { return fs::exists(upload_ / (id + ".mailing")); }
    bool isInOutbox(std::string const& id) const { return fs::exists(data_ / "outbox" / (id + ".mailing")); }

    fs::path upload_ = folder_ / "upload";
    std::string letter_;
    int letters_ = 0;
};

TEST_F(MailingsOfANode, AreSentByTokensThatMaySendForIt) {
    add("office", "send", "u=bob/a=acme");
    add("reader", "read", "a=acme");
    add("other", "send", "a=other");
    auto const send = [&](std::string const& name) {
        return as(name, {"mail", "--send", "--node", "u=bob/a=acme", letter_});
    };
    Result const sent = send("office");
    EXPECT_EQ(sent.status, VlMail::FINE) << sent.err;
    EXPECT_THAT(send("reader").err,
                HasSubstr("this needs the role send at u=bob/a=acme, and the token reader"));
    EXPECT_THAT(send("other").err,
                HasSubstr("this needs the role read at u=bob/a=acme, and the token other"));
    EXPECT_THAT(as("office", {"status"}).out, HasSubstr("Bills"));
    EXPECT_THAT(as("other", {"status"}).out, testing::Not(HasSubstr("Bills")));
}

TEST_F(MailingsOfANode, GoOutByThemselvesWhenTheyAreToGoAtOnce) {
    setPackPreset(R"("process_mode": 3)");
    std::string const id = mail();
    awaitState(id, "submitted");
    EXPECT_TRUE(isHandedOver(id));
}

TEST_F(MailingsOfANode, ArePlannedWithTheChannelOfEachLetterAndItsPrice) {
    output({"settings", "service",
            R"(tariff={"currency":"EUR","letter":85,"channels":{"postal":{"letter":70,"sheet":12}}})"});
    std::string const plan = (folder_ / "plan.json").string();
    std::string const name = fs::path(letter_).filename().string();
    EXPECT_THAT(output({"plan", letter_, "--node", "u=bob/a=acme", "-o", plan, "--price"}),
                testing::ContainsRegex("\nletter +channel  pages  sheets  price\n" + name +
                                       " +postal       1       1   0.82\n"));
    EXPECT_THAT(output({"plan", letter_, "--node", "u=bob/a=acme", "-o", plan, "--price", "--json"}),
                HasSubstr(R"("ways":[{"documents":[")" + name +
                          R"("],"pages":1,"sheets":1,"channel":"postal","price":82}])"));
    EXPECT_THAT(
        output({"plan", letter_, "--node", "u=bob/a=acme", "-o", plan}),
        testing::ContainsRegex("\nletter +channel  pages  sheets\n" + name + " +postal       1       1\n"));
}

TEST_F(MailingsOfANode, ArePlannedWithThePricesOfAllWaysThatALetterMayFallBackTo) {
    output({"settings", "set", "a=acme", "presets",
            write("presets.json",
                  R"({"extract_presets": [{"match": ".*", "pack_preset": "Bills", "zones": [)"
                  R"({"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, )"
                  R"("fields": [{"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 2, )"
                  R"("send_to_server": true}, {"name": "email", "value_extract": "^Mail: (?<VAL>.*)$", )"
                  R"("priority": 1, "send_to_server": true}]}]}], "pack_presets": [{"name": "Bills", )"
                  R"("title": "Bills", "production": {"fallback": ["fax", "email"]}}]})")});
    output({"settings", "service",
            R"(tariff={"currency":"EUR","letter":85,"channels":{"email":{"letter":5}}})"});
    std::string const letter = write("b.txt", "To: Ada\nMail: ada@example.org\n");
    std::string const plan = (folder_ / "plan.json").string();
    EXPECT_THAT(output({"plan", letter, "--node", "u=bob/a=acme", "-o", plan, "--price"}),
                testing::ContainsRegex("\nb.txt +postal, else email +1 +1  0.85, else 0.05\n"));
    EXPECT_THAT(output({"plan", letter, "--node", "u=bob/a=acme", "-o", plan, "--price", "--json"}),
                HasSubstr(R"("channel":"postal","price":85,"fallback":[{"channel":"email","price":5}])"));
}

TEST_F(MailingsOfANode, TellTheirSenderOnceTheyAreHandedOver) {
    setPackPreset(
        R"("process_mode": 3, "confirmation_email": true, "customer_email": "office@acme.example")");
    EXPECT_THAT(
        output({"mail", "--send", "--node", "u=bob/a=acme", letter_}),
        HasSubstr("note: pack preset \"Bills\" wants an e-mail when its mailing is handed over, which "
                  "nobody sends: the service has no carrier \"email\" of the type smtp\n"));
    VLServiceTest::SmtpServer const server(folder_ / "mails", {});
    if (!server.missing().empty())
        GTEST_SKIP() << server.missing();
    output({"settings", "service",
            R"(carriers={"email":{"type":"smtp","starttls":false,"url":")" + server.url() +
                R"(","from":"bills@acme.example","subject":"Letter"}})"});
    std::string const id = mail();
    server.awaitMessage();
    ASSERT_EQ(server.messages().size(), 1U);
    EXPECT_THAT(server.messages().front(), HasSubstr("\noffice@acme.example\n"));
    EXPECT_THAT(server.messages().front(), HasSubstr("handed on in the mailing's container"));
    std::string shown;
    while (shown.find("accepted") == std::string::npos)
        shown = output({"status", id});
    EXPECT_THAT(shown, testing::ContainsRegex("\nmailing +notice  of           state     since +note\n" + id +
                                              "  n1      the mailing  accepted  "));
    EXPECT_EQ(
        complaint({"resend", id, "n1"}),
        "vlmail: notice 1 of mailing " + id +
            " is accepted: only one that is uncertain, failed or returned is sent again [state-refused]\n");
    EXPECT_EQ(complaint({"resend", id, "n"}),
              "vlmail: \"n\" is no number of a letter: vlmail status MAILING shows them [usage]\n");
}

TEST_F(MailingsOfANode, AreHeldThroughAnUploadAndAKilledServiceUntilTheyAreReleased) {
    setPackPreset(R"("process_mode": 8)");
    std::string const id = mail({"--upload"});
    EXPECT_EQ(stateOf(id), "held");
    service_.signal(SIGKILL);
    service_.wait();
    ServiceProcess const next({"--data", data_.string(), "--no-discovery"});
    auto const nextOutput = [&](std::vector<std::string> arguments) {
        arguments.insert(arguments.end(), {"--service", "127.0.0.1:" + std::to_string(next.port()), "--token",
                                           (data_ / "token").string()});
        return run(arguments).out;
    };
    EXPECT_THAT(nextOutput({"status", id}), HasSubstr("  held  "));
    EXPECT_FALSE(isHandedOver(id));
    EXPECT_EQ(nextOutput({"release", id}), id + ", queued\n");
    while (nextOutput({"status", id}).find("  submitted  ") == std::string::npos)
        std::this_thread::yield();
    EXPECT_TRUE(isHandedOver(id));
}

TEST_F(MailingsOfANode, WaitForTheirSlotAndTellIt) {
    setPackPreset(R"("delay": {"count": 300}, "process_mode": 2)");
    std::string const id = mail({"--upload"});
    EXPECT_EQ(stateOf(id), "held");
    long long const due = jobOf(id).get("due").intOrZero();
    EXPECT_NEAR(static_cast<double>(due - std::time(nullptr)) / 86'400, 299.5, 1);
    EXPECT_THAT(output({"status", id}), HasSubstr("until "));
    EXPECT_EQ(output({"hold", id}), id + ", held\n");
    EXPECT_EQ(jobOf(id).get("due").intOrZero(), 0);
    EXPECT_EQ(output({"release", id}), id + ", queued\n");
    awaitState(id, "submitted");
}

TEST_F(MailingsOfANode, AreCalledBackUntilTheyAreHandedOver) {
    std::string const one = mail();
    std::string const two = mail();
    EXPECT_EQ(output({"cancel", one}), one + ", cancelled\n");
    EXPECT_EQ(stateOf(one), "cancelled");
    EXPECT_FALSE(isInOutbox(one));
    output({"upload"});
    awaitState(two, "submitted");
    EXPECT_FALSE(isHandedOver(one));
    Result const late = vlmail({"cancel", two, one});
    EXPECT_EQ(late.status, VlMail::INCOMPLETE);
    EXPECT_EQ(late.out, one + ", cancelled\n");
    EXPECT_THAT(late.err, testing::StartsWith("vlmail: it is too late to cancel mailing " + two +
                                              ": the upload folder " + upload_.string() + " has it since "));
    EXPECT_EQ(vlmail({"hold", two}).status, VlMail::FAILED);
    EXPECT_EQ(complaint({"release", "none"}), "vlmail: there is no mailing none [mailing-unknown]\n");
}

TEST_F(MailingsOfANode, AreTriedWithoutBeingHandedOver) {
    setPackPreset(R"("process_mode": 131)");
    std::string const id = mail({"--upload"});
    awaitState(id, "tried");
    EXPECT_TRUE(isInOutbox(id));
    EXPECT_FALSE(isHandedOver(id));
}

TEST_F(MailingsOfANode, AreRefusedByTheClientWithTheNodeThatDoesNotAllowThem) {
    output({"settings", "set", "a=acme", "app", "max_letter_sheets=1"});
    letter_ = write("a.txt", "To: Ada\n\fmore\n");
    Result const result = vlmail({"mail", "--send", "--node", "u=bob/a=acme", letter_});
    EXPECT_EQ(result.status, VlMail::INCOMPLETE);
    EXPECT_THAT(result.out, HasSubstr("too-many-sheets: 2 sheets, 1 allowed by a=acme\n"));
    EXPECT_EQ(output({"status"}), "the service has no such mailings\n");
}

TEST_F(MailingsOfANode, AreRefusedByTheServiceWhateverTheClientSends) {
    output({"settings", "set", "a=acme", "app", "max_letter_sheets=2", "enforce_po=true"});
    fs::path const database = folder_ / "packs.db";
    storePack(database, "p1", "u=bob/a=acme");
    auto const client = clientOf(service_, data_);
    EXPECT_EQ(failureOf([&] { VlMail::sendPack(*client, database, "p1", false); }),
              "The service refuses: purchase-order-missing: no purchase order, one wanted by a=acme; "
              "too-many-sheets: 3 "
              "sheets, 2 allowed by a=acme; pack p1 is not taken");
}

TEST_F(MailingsOfANode, BearThePurchaseOrderOfTheirNode) {
    output({"settings", "set", "/", "po", "code=P-1"});
    std::string const id = mail();
    PackWrapper container((data_ / "outbox" / (id + ".mailing")).string(), PackWrapper::PURPOSE_IMPORT, "");
    EXPECT_EQ(Mailing::Metadata::fromBlob(container.inputFullMeta()).purchaseOrder, "P-1");
}

TEST_F(MailingsOfANode, AreToldToAnOlderClientInStatesThatItKnows) {
    setPackPreset(R"("process_mode": 8)");
    std::string const id = mail();
    auto const client = clientOf(service_, data_);
    json::Object const answer = client->call<Ipc::CSConfigIdsList>(json::Object{{"query", "jobs"}})->resp();
    EXPECT_EQ(answer.get("jobs").toArray().at(0).toObject().get("state"), json::Value("queued"));
}

TEST_F(MailingsOfANode, CannotReplaceALockedPresetBelow) {
    setPackPreset(R"("lock_pack_ui": true)");
    EXPECT_EQ(
        complaint({"settings", "set", "u=bob/a=acme", "presets", R"(pack_presets=[{"name":"Bills"}])"}),
        "vlmail: the settings \"presets\" were not changed: the pack preset \"Bills\" is locked by a=acme "
        "(\"lock_pack_ui\"): nodes below cannot replace it [setting-invalid]\n");
}

// Without a service.

TEST(NodeIdFromAPerson, IsCompletedUnlessItIsComplete) {
    std::pair<char const*, char const*> const cases[] = {
        {"/", ""},
        {"", ""},
        {"a=acme", "a=acme"},
        {"bob/acme", "u=bob/a=acme"},
        {"bob/sales/acme", "u=bob/ou=sales/a=acme"},
        {"u=bob", "u=bob/"},
        {"u=bob/", "u=bob/"},
        {"u=bob/ou=sales/a=acme", "u=bob/ou=sales/a=acme"},
    };
    for (auto const& [text, id] : cases)
        EXPECT_EQ(VlMail::nodeIdIn(text), id) << text;
}

TEST(ServiceAddressFromAPerson, IsHostAndPort) {
    EXPECT_EQ(VlMail::parseServiceAddress("mail.example:45001").text(), "mail.example:45001");
    EXPECT_EQ(VlMail::parseServiceAddress("10.0.0.1:1").host, "10.0.0.1");
    EXPECT_EQ(VlMail::parseServiceAddress("[fe80::1%eth0]:65535").host, "fe80::1%eth0");
    EXPECT_EQ(VlMail::parseServiceAddress("[::1]:7").text(), "[::1]:7");
    for (char const* text :
         {"", "host", "host:", ":7", "host:0", "host:65536", "host:7x", "::1:7", "[]:7", "a b:7"})
        EXPECT_EQ(failureOf([&] { VlMail::parseServiceAddress(text); }),
                  "\"" + std::string(text) +
                      "\" names no service: write HOST:PORT, with an IPv6 address in brackets");
}

TEST(ServiceAddressInAnAnswer, IsTestedBeforeItIsUsed) {
    std::optional<VlMail::ServiceAddress> const found =
        VlMail::addressInAnswer(parse(R"({"host":"10.0.0.1","port":7})"));
    ASSERT_TRUE(found);
    EXPECT_EQ(found->text(), "10.0.0.1:7");
    for (char const* answer :
         {"{}", R"({"host":"x"})", R"({"port":7})", R"({"host":"x","port":"7"})",
          R"({"host":"x","port":70000})", R"({"host":"x","port":-1})", R"({"host":"","port":7})",
          R"({"host":"a b","port":7})", R"({"host":["x"],"port":7})"})
        EXPECT_FALSE(VlMail::addressInAnswer(parse(answer))) << answer;
}

TEST(DiscoveryHints, SayWhatAPersonCanTry) {
    VlMail::ProbeReport loopback{"lo", "127.0.0.1", false, "", true, {}, 0};
    VlMail::ProbeReport silent{"eth0", "10.0.0.2", false, "", true, {}, 0};
    VlMail::ProbeReport deaf{"eth1", "fd00::2", true, "", false, {}, 0};
    VlMail::ProbeReport broken{"eth2", "10.1.0.2", false, "send: Network is unreachable", false, {}, 0};
    VlMail::ProbeReport answered{"eth3", "10.2.0.2", false, "", true, {"10.2.0.9:7 (from 10.2.0.9)"}, 0};
    std::string const last =
        "Without discovery, name the service with --service HOST:PORT; it prints its port "
        "when it starts.";
    using testing::ElementsAre;
    EXPECT_THAT(VlMail::hintsFor({silent, answered}), ElementsAre());
    EXPECT_THAT(
        VlMail::hintsFor({}),
        ElementsAre("No network interface is up but loopback: connect this host to a network.", last));
    EXPECT_THAT(
        VlMail::hintsFor({loopback}),
        ElementsAre("No network interface is up but loopback: connect this host to a network.", last));
    EXPECT_THAT(
        VlMail::hintsFor({loopback, silent, deaf, broken}),
        ElementsAre("eth0 (IPv4): the request went out and nobody answered. A service answers only in the "
                    "same network, and a firewall there may hold up UDP port 45677.",
                    "eth1 (IPv6): the request did not come back to this host. A firewall here may hold up "
                    "UDP port 45677.",
                    "eth2 (IPv4): the request could not be sent. Has the interface a route for multicast? "
                    "(ip route)",
                    last));
}

TEST(DiscoveryHints, AreThereInTheAnswerForPrograms) {
    VlMail::ProbeReport const report{"eth2", "10.1.0.2", false, "send: no", false, {}, 2};
    json::Object const object = VlMail::toJson({report});
    EXPECT_EQ(print(object.get("interfaces")), R"([{"interface":"eth2","address":"10.1.0.2","ipv6":false,)"
                                               R"("failure":"send: no","heard_itself":false,"answers":[],)"
                                               R"("foreign":2}])");
    EXPECT_EQ(object.get("hints").toArray().size(), 2u);
}

} // namespace
