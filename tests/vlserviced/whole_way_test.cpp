// The programs as people run them, from documents to a folder of mailings: what they give twice, and what
// they tell nobody.
#include "programs/vlmail/pack/container_file.h"
#include "programs/vlmail/service/service_client.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/service_process.h"

#include <gmock/gmock.h>

#include <csignal>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <set>
#include <sys/wait.h>

namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;
using testing::Not;

/// Stands in letters, and in names of documents.
constexpr char const* PERSON = "Quibbelmeier";

std::string fileText(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

class WholeWay : public testing::Test {
protected:
    WholeWay() { fs::create_directory(folder_ / "upload"); }

    struct Ended {
        int status = 0;
        std::string out;
        std::string log;
    };

    /// Runs the program in the folder.
    Ended vlmail(std::vector<std::string> const& arguments) {
        fs::path const out = folder_ / "stdout";
        fs::path const log = folder_ / "stderr";
        std::string command = "cd '" + folder_.path().string() + "' && '" VLMAIL_PROGRAM "'";
        for (std::string const& argument : arguments)
            command += " '" + argument + '\'';
        command += " >'" + out.string() + "' 2>'" + log.string() + '\'';
        int const status = std::system(command.c_str());
        return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, fileText(out), fileText(log)};
    }
    void write(std::string const& name, std::string const& text) const {
        std::ofstream(folder_.path() / name, std::ios::binary) << text;
    }

    TemporaryFolder folder_;
};

/// Its pages with their lengths and checksums, in their order.
std::string pagesIn(fs::path const& mailing) {
    VlMail::ContainerFile container(mailing);
    std::string pages;
    for (unsigned long long i = 0; i < container.size(); ++i)
        if (auto const& entry = container.entry(i); VlMail::isPage(entry))
            pages += entry.document + ' ' + entry.name + ' ' + std::to_string(entry.length) + ' ' +
                     std::to_string(entry.crc) + '\n';
    return pages;
}

TEST_F(WholeWay, GivesTheSameBytesForTheSameDocuments) {
    fs::path const letters = fs::path(EXAMPLE_LETTERS) / "german-office";
    std::vector<std::string> documents{"--settings", (letters / "presets.json").string(), "--documents",
                                       (letters / "documents").string()};
    for (fs::directory_entry const& entry : fs::directory_iterator(letters))
        if (entry.is_regular_file() && entry.path().extension() != ".json")
            documents.push_back(entry.path().string());
    auto const outputs = [&](std::string const& run) {
        auto const reading = [&](std::vector<std::string> arguments) {
            arguments.insert(arguments.end(), documents.begin(), documents.end());
            Ended const ended = vlmail(arguments);
            EXPECT_NE(ended.status, 1) << ended.log;
            return ended.out;
        };
        std::vector<std::string> all{reading({"letter", "--json", "--explain", "--jobs", run}),
                                     reading({"letter", "--explain", "--report", run + ".html"}),
                                     reading({"plan", "-o", run + ".json", "--jobs", run}),
                                     vlmail({"presets", "lint", documents[1]}).out,
                                     fileText(folder_.path() / (run + ".html")),
                                     fileText(folder_.path() / (run + ".json"))};
        reading({"mail", "-o", run});
        std::set<std::string> mailings;
        for (fs::directory_entry const& mailing : fs::directory_iterator(folder_.path() / run))
            mailings.insert(pagesIn(mailing.path()));
        all.insert(all.end(), mailings.begin(), mailings.end());
        return all;
    };
    std::vector<std::string> const once = outputs("1");
    EXPECT_EQ(once.size(), 8U);
    for (std::string const& output : once)
        EXPECT_NE(output, "");
    EXPECT_TRUE(once == outputs("2"));
}

class WholeWayToTheService : public WholeWay {
protected:
    Ended vlmailWithService(std::vector<std::string> arguments) {
        for (std::string const& more :
             {std::string("--service"), "127.0.0.1:" + std::to_string(service_.port()),
              std::string("--token"), std::string("data/token")})
            arguments.push_back(more);
        return vlmail(arguments);
    }
    /// A mailing that the service can only give up, with a person's name in its document's.
    void sendBadPack() {
        fs::path const database = folder_ / "bad.db";
        {
            Mailing::PackDatabaseWriter writer(database, {"bad", "a=acme", "Title"});
            std::string const page = std::string("no blob, but a letter to ") + PERSON;
            writer.savePage(std::string(PERSON) + ".pdf", "1",
                            SharedMemBuffer::copyOf(page.data(), page.size()));
            writer.finish(zipped(metadataText("bad")));
        }
        auto const client = clientOf(service_, data_);
        VlMail::sendPack(*client, database, "bad", false);
        EXPECT_EQ(VlMail::awaitJob(*client, "bad", std::chrono::seconds(60)).state,
                  Protocol::JobState::Failed);
    }
    /// Lets the carrier report something that cannot be read.
    void reportInVain() {
        for (fs::directory_entry const& mailing : fs::directory_iterator(folder_ / "upload"))
            if (mailing.path().extension() == ".mailing")
                std::ofstream(mailing.path().string() + ".status")
                    << "{\"text\": " << PERSON << " has moved}";
        vlmailWithService({"status", "--update"});
    }
    std::string endAndGiveLog() {
        service_.signal(SIGTERM);
        EXPECT_EQ(service_.wait(), 0);
        return service_.errors();
    }

    fs::path data_ = folder_ / "data";
    ServiceProcess service_{
        {"--data", data_.string(), "--no-discovery", "--verbose", "--local-packs", folder_.path().string()}};
};

constexpr char const* SETTINGS_OF_THE_WAY = R"({
    "extract_presets": [{"match": ".*", "pack_preset": "Letters", "zones": [
        {"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
            {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true},
            {"name": "total", "value_extract": "^Total: (?<VAL>.*)$", "value_type": 2, "value_min": 0},
            {"name": "slow", "value_extract": "^(?<VAL>(\\w+\\s?)*)!$"},
            {"name": "broken", "value_extract": "^To: (?<VAL>.*)$", "value_match": "(a+)+b"}]}]}],
    "pack_presets": [{"name": "Letters", "title": "Letters"}]})";

TEST_F(WholeWayToTheService, LeavesNothingOfALetterInALog) {
    write("settings.json", SETTINGS_OF_THE_WAY);
    write("a.txt", std::string("To: ") + PERSON + "\nTotal: 12.50\n");
    write("b.txt", std::string("To: ") + PERSON + "\nTotal: much to " + PERSON + '\n');
    write("c.pdf", std::string("%PDF-1.7 damaged by ") + PERSON);
    write("way.json", R"({"extract_presets": [{"match": ".*", "pack_preset": "Letters", "zones": [
        {"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
            {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true}]}]}],
        "pack_presets": [{"name": "Letters", "title": "Letters"}]})");
    vlmailWithService({"settings", "service", "upload_folder=" + (folder_ / "upload").string()});
    vlmailWithService({"settings", "set", "a=acme", "app", "db_host=" + (folder_ / "packs").string()});

    std::string logs =
        vlmail({"letter", "--explain", "--settings", "settings.json", "a.txt", "b.txt", "c.pdf"}).log;
    Ended const sent = vlmailWithService({"mail", "--send", "--upload", "--settings", "way.json", "--node",
                                          "a=acme", "a.txt", "b.txt", "c.pdf"});
    EXPECT_THAT(sent.out, HasSubstr("1 document failed")) << sent.log;
    logs += sent.log;
    sendBadPack();
    while (fs::is_empty(folder_ / "upload"))
        vlmailWithService({"status"});
    reportInVain();
    logs += endAndGiveLog();

    EXPECT_THAT(logs, HasSubstr("c.pdf"));
    EXPECT_THAT(logs, HasSubstr("Pack bad is given up"));
    EXPECT_THAT(logs, HasSubstr(".mailing.status\" cannot be read: it is no JSON object"));
    EXPECT_THAT(logs, Not(HasSubstr(PERSON)));
}

} // namespace
