// Letterheads and attachments that the service keeps: put, listed, read back, removed, and laid on letters.
#include "programs/base/digest.h"
#include "programs/mailing/metadata.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/service/service_documents.h"
#include "tests/support/failure_of.h"
#include "tests/support/raw_pdf.h"
#include "tests/support/small_disk.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/pack/pack_wrapper.h"

#include <gmock/gmock.h>

#include <csignal>
#include <fstream>
#include <iterator>

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;

class ServedDocuments : public testing::Test {
protected:
    ServedDocuments() {
        write("blue.txt", "\n\n\n\n\n\nblue of acme");
        write("root.txt", "\n\n\n\n\n\nblue of all");
        write("a.txt", "To: Ada");
        write("node.json",
              R"({"extract_presets": [{"match": ".*", "pack_preset": "P", "zones": [{"name": "Page",
             "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
              {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true}]}]}],
            "pack_presets": [{"name": "P", "letterheads": ["blue"]}]})");
        output({"settings", "set", "u=bob/a=acme", "presets", path("node.json")});
    }

    std::string path(std::string const& name) const { return (folder_.path() / name).string(); }
    void write(std::string const& name, std::string const& bytes) const {
        std::ofstream(path(name), std::ios::binary) << bytes;
    }
    std::string read(std::string const& name) const {
        std::ifstream in(path(name), std::ios::binary);
        return {std::istreambuf_iterator<char>(in), {}};
    }

    /// Runs vlmail with the service named.
    Ran vlmail(std::vector<std::string> arguments) const {
        for (std::string const& more :
             {std::string("--service"), "127.0.0.1:" + std::to_string(service_.port()),
              std::string("--token"), (data_ / "token").string()})
            arguments.push_back(more);
        return runVlMail(arguments);
    }
    std::string output(std::vector<std::string> const& arguments) const {
        Ran const ran = vlmail(arguments);
        EXPECT_EQ(ran.status, 0) << ran.err;
        return ran.out;
    }
    std::string complaint(std::vector<std::string> const& arguments) const {
        Ran const ran = vlmail(arguments);
        EXPECT_EQ(ran.status, 1) << ran.out;
        return ran.err;
    }
    std::string put(std::string const& node, std::string const& id, std::string const& file) const {
        return output({"documents", "put", "--node", node, id, path(file)});
    }

    /// The digests of the documents that the one mailing in the folder "out" has used; the folder is emptied.
    std::vector<std::string> usedInMailing() const {
        std::vector<std::string> digests;
        for (auto const& entry : fs::directory_iterator(folder_ / "out")) {
            PackWrapper container(entry.path().string(), PackWrapper::PURPOSE_IMPORT, {});
            for (auto const& used : Mailing::Metadata::fromBlob(container.inputFullMeta()).usedDocuments)
                digests.push_back(used.sha256);
        }
        fs::remove_all(folder_ / "out");
        return digests;
    }
    std::vector<std::string> mailed(std::vector<std::string> more) const {
        std::vector<std::string> arguments{"mail", "-o", path("out")};
        arguments.insert(arguments.end(), more.begin(), more.end());
        output(arguments);
        return usedInMailing();
    }
    std::string digestOf(std::string const& file) const { return Base::sha256(read(file)); }

    TemporaryFolder folder_;
    fs::path data_ = folder_ / "data";
    ServiceProcess service_{{"--data", data_.string(), "--no-discovery"}};
};

TEST_F(ServedDocuments, ArePutListedReadBackAndRemoved) {
    std::string const version = digestOf("blue.txt");
    EXPECT_EQ(put("a=acme", "Blue", "blue.txt"), "Blue.txt is at a=acme, version " + version + "\n");
    EXPECT_EQ(output({"documents", "put", "--node", "/", path("root.txt")}),
              "root.txt is at the root, version " + digestOf("root.txt") + "\n");
    std::string const list = output({"documents", "list", "--node", "bob/acme"});
    EXPECT_THAT(list, testing::MatchesRegex("document +at +bytes +since +version\n"
                                            "Blue.txt +a=acme +18 .* " +
                                            version + "\nroot.txt +the root +17 .*\n"));
    EXPECT_THAT(
        output({"documents", "list", "--node", "bob/acme", "--json"}),
        StartsWith(R"({"documents":[{"name":"Blue.txt","node":"a=acme","bytes":18,"sha256":")" + version));
    EXPECT_EQ(output({"documents", "get", "--node", "bob/acme", "Blue", path("back")}),
              "Blue.txt of a=acme is in \"" + path("back") + "\", version " + version + "\n");
    EXPECT_EQ(read("back"), read("blue.txt"));
    EXPECT_EQ(complaint({"documents", "remove", "--node", "bob/acme", "Blue"}),
              "vlmail: node u=bob/a=acme has no document \"Blue\" of its own; \"vlmail documents list\" "
              "shows which "
              "lies where [document-unknown]\n");
    EXPECT_EQ(output({"documents", "remove", "--node", "a=acme", "Blue"}),
              "Blue.txt is gone from a=acme, version " + version + "\n");
    EXPECT_EQ(
        complaint({"documents", "get", "--node", "a=acme", "Blue"}),
        "vlmail: there is no document \"Blue\" at a=acme and above it; \"vlmail documents list\" shows what "
        "there is [document-unknown]\n");
    EXPECT_EQ(output({"documents", "remove", "--node", "/", "root.txt"}).substr(0, 8), "root.txt");
    EXPECT_EQ(output({"documents", "list", "--node", "a=acme"}), "no document counts at a=acme\n");
}

TEST_F(ServedDocuments, AreLaidOnLettersTheNearestNodesFirst) {
    put("/", "blue", "root.txt");
    std::vector<std::string> const atNode{"--node", "bob/acme", path("a.txt")};
    EXPECT_THAT(mailed(atNode), ElementsAre(digestOf("root.txt")));
    put("a=acme", "blue", "blue.txt");
    EXPECT_THAT(mailed(atNode), ElementsAre(digestOf("blue.txt")));
    write("blue.txt", "\n\n\n\n\n\nblue of a later day");
    put("a=acme", "blue", "blue.txt");
    EXPECT_THAT(mailed(atNode), ElementsAre(digestOf("blue.txt")));
    EXPECT_THAT(mailed({"--node", "/", "--settings", path("node.json"), path("a.txt")}),
                ElementsAre(digestOf("root.txt")));
}

TEST_F(ServedDocuments, ComeBehindThoseOfTheFolder) {
    put("a=acme", "blue", "blue.txt");
    fs::create_directory(folder_ / "docs");
    EXPECT_THAT(mailed({"--node", "bob/acme", "--documents", path("docs"), path("a.txt")}),
                ElementsAre(digestOf("blue.txt")));
    write("docs/blue.txt", "\n\n\n\n\n\nblue of the folder");
    EXPECT_THAT(mailed({"--node", "bob/acme", "--documents", path("docs"), path("a.txt")}),
                ElementsAre(digestOf("docs/blue.txt")));
}

TEST_F(ServedDocuments, AreThoseOfTheNodeThatMailingsAreSentFor) {
    put("a=acme", "blue", "blue.txt");
    EXPECT_THAT(output({"mail", "--send", "--node", "bob/acme", path("a.txt"), "--json"}),
                HasSubstr(R"("letters":1,"sent_as":1)"));
    output({"documents", "remove", "--node", "a=acme", "blue"});
    Ran const ran = vlmail({"mail", "--send", "--node", "bob/acme", path("a.txt")});
    EXPECT_EQ(ran.status, 2);
    EXPECT_THAT(ran.out,
                HasSubstr("document-unknown: there is no document \"blue\" at u=bob/a=acme in the service; "
                          "put it there with \"vlmail documents put\", or correct the pack preset"));
}

TEST_F(ServedDocuments, ServeLetterAndCheck) {
    EXPECT_THAT(vlmail({"check", "--node", "bob/acme", path("a.txt")}).out,
                HasSubstr("error document-unknown"));
    EXPECT_THAT(vlmail({"letter", "--node", "bob/acme", path("a.txt")}).out,
                HasSubstr("error document-unknown"));
    put("a=acme", "blue", "blue.txt");
    EXPECT_THAT(output({"check", "--node", "bob/acme", path("a.txt")}),
                HasSubstr("letter 1 of 1, page 1: ready"));
    EXPECT_THAT(output({"letter", "--node", "bob/acme", path("a.txt")}),
                HasSubstr("sent by the pack preset P"));
}

TEST_F(ServedDocuments, ArePlannedByTheirDigests) {
    put("a=acme", "blue", "blue.txt");
    output({"plan", "--node", "bob/acme", "-o", path("plan.json"), path("a.txt")});
    EXPECT_THAT(read("plan.json"),
                HasSubstr(R"("used_documents":[{"file":"service:a=acme/blue.txt","sha256":")" +
                          digestOf("blue.txt") + R"(","id":"blue","service":true}])"));
    std::string const planned = digestOf("blue.txt");
    put("bob/acme", "blue", "root.txt");
    EXPECT_THAT(mailed({"--plan", path("plan.json")}), ElementsAre(planned))
        << "what was decided is carried out";
    write("blue.txt", "another");
    put("a=acme", "blue", "blue.txt");
    EXPECT_EQ(
        complaint({"mail", "--plan", path("plan.json"), "-o", path("out")}),
        "vlmail: cannot carry out the plan: \"service:a=acme/blue.txt\": the service has no document of the "
        "digest " +
            planned +
            " any more: it was replaced or removed; make it again with vlmail plan [plan-outdated]\n");
}

TEST_F(ServedDocuments, ArePlannedWithTheSettingsOfTheirNode) {
    put("a=acme", "blue", "blue.txt");
    output({"plan", "--node", "bob/acme", "-o", path("plan.json"), path("a.txt")});
    output({"settings", "reset", "bob/acme", "presets"});
    EXPECT_THAT(mailed({"--plan", path("plan.json")}), ElementsAre(digestOf("blue.txt")));
}

TEST_F(ServedDocuments, OfManyPiecesArriveAsTheyWere) {
    std::string bytes(static_cast<std::size_t>(Protocol::MAX_PIECE_BYTES) * 3 + 12'345, '\0');
    for (std::size_t i = 0; i < bytes.size(); ++i)
        bytes[i] = static_cast<char>(i * i >> 7);
    auto const client = clientOf(service_, data_);
    std::string const digest = VlMail::putDocument(*client, "a=acme", "large.pdf", bytes);
    EXPECT_EQ(digest, Base::sha256(bytes));
    EXPECT_TRUE(VlMail::fetchDocument(*client, digest) == bytes);
    EXPECT_EQ(VlMail::documentsOf(*client, "a=acme").documents.front().bytes,
              static_cast<long long>(bytes.size()));
}

TEST_F(ServedDocuments, OutliveTheServiceThatIsKilledBetweenPieces) {
    put("a=acme", "blue", "blue.txt");
    {
        auto const client = clientOf(service_, data_);
        Protocol::DocumentUpload piece;
        piece.id = "a=acme";
        piece.name = "blue.txt";
        piece.bytes = 100;
        piece.sha256 = std::string(64, '0');
        piece.data = "eHh4";
        VlMail::ask(*client, piece);
    }
    service_.signal(SIGKILL);
    service_.wait();
    ServiceProcess const next({"--data", data_.string(), "--no-discovery"});
    auto const client = clientOf(next, data_);
    auto const documents = VlMail::documentsOf(*client, "a=acme").documents;
    ASSERT_EQ(documents.size(), 1U);
    EXPECT_EQ(VlMail::fetchDocument(*client, documents.front().sha256), read("blue.txt"));
}

TEST_F(ServedDocuments, AreRefusedInALineWithWhatToDo) {
    write("cut.pdf", "%PDF-1.7 nothing");
    write("empty.pdf", "");
    EXPECT_THAT(complaint({"documents", "put", "--node", "a=acme", path("cut.pdf")}),
                testing::MatchesRegex("vlmail: document-damaged: .*cut.pdf: [^\n]*; [^\n]*\n"));
    EXPECT_EQ(complaint({"documents", "put", "--node", "a=acme", path("empty.pdf")}),
              "vlmail: document-damaged: " + path("empty.pdf") +
                  ": is empty; export the document again [document-unreadable]\n");
    EXPECT_THAT(complaint({"documents", "put", "--node", "a=acme", path("gone.pdf")}),
                StartsWith("vlmail: document-unknown: "));
    EXPECT_EQ(complaint({"documents", "put", "--node", "a=acme", "../up", path("blue.txt")}),
              "vlmail: the document \"../up.txt\" was not stored: that cannot be the name of a document; "
              "choose one "
              "without / \\ : * ? \" < > |, control characters and a dot in front, of at most 200 bytes "
              "[document-unreadable]\n");
    EXPECT_EQ(
        complaint({"documents", "put", "--node", "nobody/acme", path("blue.txt")}),
        "vlmail: there is no node u=nobody/a=acme; correct the id, or set something at it first (\"vlmail "
        "settings set\") [node-unknown]\n");
    fs::resize_file(path("empty.pdf"), Protocol::MAX_DOCUMENT_BYTES + 1);
    EXPECT_EQ(complaint({"documents", "put", "--node", "a=acme", path("empty.pdf")}),
              "vlmail: document-size: " + path("empty.pdf") +
                  ": has more than 64 MiB; leave out what is not to be printed [document-unreadable]\n");
    EXPECT_EQ(output({"documents", "list", "--node", "a=acme"}), "no document counts at a=acme\n");
}

TEST_F(ServedDocuments, AreWrittenWholeOrNotAtAll) {
    VLServiceTest::SmallDisk const disk;
    if (!disk.whyNot().empty())
        GTEST_SKIP() << disk.whyNot();
    std::string lines;
    for (int line = 0; line < 1000; ++line)
        lines += "a line of the terms\n";
    write("blue.txt", lines);
    put("a=acme", "blue", "blue.txt");
    EXPECT_THAT(complaint({"documents", "get", "--node", "a=acme", "blue", disk.path() + "/back"}),
                HasSubstr("No space left on device"));
    EXPECT_TRUE(fs::is_empty(disk.path()));
    EXPECT_THAT(complaint({"documents", "get", "--node", "a=acme", "blue", path("none/back")}),
                HasSubstr("none"));
}

} // namespace
