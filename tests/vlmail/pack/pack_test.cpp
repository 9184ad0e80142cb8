// vlmail pack as a person runs it: a container, a command line, what is printed and the exit status.
#include "programs/base/error.h"
#include "programs/mailing/entries_digest.h"
#include "programs/mailing/metadata.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/pack/container_check.h"
#include "programs/vlmail/pack/salvage_plan.h"
#include "tests/support/small_disk.h"
#include "tests/support/temporary_folder.h"
#include "vlservice/json/json_text.h"
#include "vlservice/pack/pack_wrapper.h"

#include <gmock/gmock.h>
#include <zlib.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <sstream>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::Pair;
using testing::StartsWith;

struct Page {
    std::string document, name, content;
};

std::string pdf(std::string const& text) { return "%PDF-1.7 " + text + " %%EOF"; }

class PackCommand : public testing::Test {
protected:
    std::vector<Page> const PAGES = {{"a.pdf", "1", pdf("first of a")},
                                     {"a.pdf", "2", pdf("second of a")},
                                     {"b.pdf", "1", pdf("only of b")}};

    static SharedMemBuffer zipped(std::string const& content) {
        return PageSaverI::zipDbData(content.data(), content.size());
    }

    static json::Object parse(std::string const& text) { return json::strToObject(text.data(), text.size()); }

    /// One letter for each document, as an ungrouped mailing has them.
    static Mailing::Metadata metadataOf(std::vector<Page> const& pages) {
        Mailing::Metadata metadata{"m1", 7, Cfg::PackPreset(parse(R"({"name": "Plain"})"), {}), {}};
        for (Page const& page : pages) {
            if (metadata.letters.empty() || metadata.letters.back().documents[0].document != page.document)
                metadata.letters.push_back({{{page.document, {}}}, {}});
            metadata.letters.back().documents[0].pages.push_back(std::stoi(page.name));
        }
        return metadata;
    }

    void pack(std::vector<Page> const& pages) { pack(pages, metadataOf(pages).toBlob()); }

    void pack(std::vector<Page> const& pages, SharedMemBuffer const& metadata) {
        PackWrapper out(file_.string(), PackWrapper::PURPOSE_OUTPUT, "m1");
        for (Page const& page : pages)
            out.savePage(page.document, page.name, zipped(page.content));
        ASSERT_TRUE(out.finalizeOutput(metadata));
    }

    /// As vlmail writes it.
    void packWithDigest(std::vector<Page> const& pages) {
        Mailing::EntriesDigest digest("m1");
        for (Page const& page : pages)
            digest.add(page.document, page.name, zipped(page.content));
        Mailing::Metadata metadata = metadataOf(pages);
        metadata.entriesDigest = digest.text();
        pack(pages, metadata.toBlob());
    }

    /// A container of these items behind these bytes.
    void forge(std::string bytes, std::string const& items) {
        std::size_t const index = bytes.size();
        bytes += "<?xml version=\"1.0\"?><vantelar><corbulet id=\"m1\">" + items + "</corbulet></vantelar>";
        for (int i = 0; i < 8; ++i)
            bytes += static_cast<char>(index >> 8 * i & 0xFF);
        write(bytes);
    }
    static std::string item(std::string const& name, std::size_t offset, std::string const& blob,
                            std::string const& role = "page") {
        auto const crc = crc32_z(0, reinterpret_cast<Bytef const*>(blob.data()), blob.size());
        return "<mailitem name=\"" + name + "\" offset=\"" + std::to_string(offset) + "\" length=\"" +
               std::to_string(blob.size()) + "\" role=\"" + role + "\" crc=\"" + std::to_string(crc) +
               "\" document=\"a.pdf\"/>";
    }
    static std::string textOf(SharedMemBuffer const& data) {
        return {reinterpret_cast<char const*>(data.data()), data.size()};
    }

    /// As by "verify", but for the command line.
    bool isToldAsDamaged() const {
        try {
            VlMail::ContainerFile container(file_.string());
            return !VlMail::checkContainer(container).damages.empty();
        } catch (Base::Error const&) {
            return true;
        }
    }

    /// What a reader learns from the index.
    static std::string indexOf(fs::path const& file) {
        PackWrapper in(file.string(), PackWrapper::PURPOSE_IMPORT, "");
        std::ostringstream text;
        text << in.packId();
        for (unsigned long long i = 0; i < in.szBins(); ++i) {
            PackWrapper::BinEntry const& bin = in.bin(i);
            text << '|' << bin.name << ',' << bin.offset << ',' << bin.length << ',' << bin.role << ','
                 << bin.crc << ',' << bin.document;
        }
        return text.str();
    }

    static std::string read(fs::path const& file) {
        std::ifstream in(file, std::ios::binary);
        return {std::istreambuf_iterator<char>(in), {}};
    }
    void write(std::string const& bytes) { std::ofstream(file_, std::ios::binary) << bytes; }

    /// Changes the byte at a position.
    void damage(std::size_t position) {
        std::string bytes = read(file_);
        bytes.at(position) = static_cast<char>(bytes.at(position) ^ 0x55);
        write(bytes);
    }
    void flip(std::size_t bit) {
        std::fstream file(file_, std::ios::in | std::ios::out | std::ios::binary);
        file.seekg(static_cast<std::streamoff>(bit / 8));
        char const byte = static_cast<char>(file.get() ^ (1 << bit % 8));
        file.seekp(static_cast<std::streamoff>(bit / 8));
        file.put(byte);
    }
    std::size_t positionOf(std::string const& text) {
        std::size_t const at = read(file_).find(text);
        EXPECT_NE(at, std::string::npos) << text;
        return at;
    }
    std::size_t lengthOfPage(Page const& page) { return zipped(page.content).size(); }

    int run(std::vector<std::string> arguments) {
        std::vector<char const*> argv{"vlmail", "pack"};
        for (std::string const& argument : arguments)
            argv.push_back(argument.c_str());
        std::ostringstream out, err;
        int const status = VlMail::run(static_cast<int>(argv.size()), argv.data(), {out, err});
        out_ = out.str();
        err_ = err.str();
        return status;
    }

    /// By name, relative to the folder.
    static std::map<std::string, std::string> filesIn(fs::path const& folder) {
        std::map<std::string, std::string> files;
        for (auto const& entry : fs::recursive_directory_iterator(folder))
            if (entry.is_regular_file())
                files[fs::relative(entry.path(), folder).string()] = read(entry.path());
        return files;
    }

    /// Document, page and expanded content of every page.
    static std::vector<std::string> pagesIn(fs::path const& file) {
        PackWrapper in(file.string(), PackWrapper::PURPOSE_IMPORT, "");
        std::vector<std::string> pages;
        for (unsigned long long i = 0; i < in.szBins(); ++i) {
            SharedMemBuffer const data = PageLoaderI::unzipDbData(in.binData(i));
            std::string const text(reinterpret_cast<char const*>(data.data()), data.size());
            if (in.bin(i).role == "page")
                pages.push_back(in.bin(i).document + ':' + in.bin(i).name + ':' + text);
        }
        return pages;
    }
    /// Without a file being written.
    std::vector<std::string> contentsThatWouldBeSaved() {
        VlMail::ByteFile file(file_);
        std::vector<std::string> contents;
        for (VlMail::SavedPage const& page : VlMail::planSalvage(file).pages) {
            SharedMemBuffer const data = PageLoaderI::unzipDbData(VlMail::salvagedBlob(file, page.blob));
            contents.emplace_back(reinterpret_cast<char const*>(data.data()), data.size());
        }
        return contents;
    }
    static std::string inOne(Page const& page) {
        return page.document + ':' + page.name + ':' + page.content;
    }

    TemporaryFolder folder_;
    fs::path file_ = folder_ / "m.mailing";
    fs::path target_ = folder_ / "new.mailing";
    std::string out_, err_;
};

using PackList = PackCommand;
using PackVerify = PackCommand;
using PackExtract = PackCommand;
using PackSalvage = PackCommand;

TEST_F(PackList, ShowsTheIndexAsATable) {
    PackWrapper out(file_.string(), PackWrapper::PURPOSE_OUTPUT, "m1");
    out.savePage("a.pdf", "1", SharedMemBuffer::copyOf("TEZ first", 9));
    out.savePage("Müller.pdf", "10", SharedMemBuffer::copyOf("TEZ second page", 15));
    ASSERT_TRUE(out.finalizeOutput(SharedMemBuffer::copyOf("TEZ metadata", 12)));
    EXPECT_EQ(run({"list", file_.string()}), 0);
    EXPECT_EQ(err_, "");
    EXPECT_EQ(out_, "mailing m1, 3 blobs\n"
                    "document             page  role       offset  length  crc\n"
                    "a.pdf                   1  page            0       9  7c9062d8\n"
                    "Müller.pdf             10  page            9      15  bd8059f9\n"
                    "            DDT440001.TDD  framework      24      12  e5466dee\n");
}

TEST_F(PackList, ShowsTheIndexAsJson) {
    pack({PAGES[0]});
    EXPECT_EQ(run({"list", file_.string(), "--json"}), 0);
    json::Object const object = parse(out_);
    EXPECT_EQ(object.get("id").textOrEmpty(), "m1");
    json::Array const items = object.get("items").toArray();
    ASSERT_EQ(items.size(), 2u);
    PackWrapper in(file_.string(), PackWrapper::PURPOSE_IMPORT, "");
    EXPECT_EQ(items.at(0), (json::Object{{"document", "a.pdf"},
                                         {"page", "1"},
                                         {"role", "page"},
                                         {"offset", 0},
                                         {"length", in.bin(0).length},
                                         {"crc", in.bin(0).crc}}));
    EXPECT_EQ(items.at(1).toObject().get("role").textOrEmpty(), "framework");
}

TEST_F(PackList, ShowsNamesOfOtherEncodingsAsValidText) {
    pack({PAGES[0]});
    std::string bytes = read(file_);
    // Without its declaration the index may hold any bytes.
    bytes.replace(bytes.find("<?xml"), bytes.find("?>") + 2 - bytes.find("<?xml"),
                  std::string(bytes.find("?>") + 2 - bytes.find("<?xml"), ' '));
    bytes.replace(bytes.find("a.pdf"), 5, "\xFC.pdf");
    write(bytes);
    EXPECT_EQ(run({"list", file_.string(), "--json"}), 0);
    EXPECT_THAT(out_, HasSubstr("\"document\":\"\xEF\xBF\xBD.pdf\""));
}

TEST_F(PackCommand, SaysInOneLineWhyAFileCannotBeRead) {
    std::string const quoted = '"' + file_.string() + '"';
    struct Case {
        char const* what;
        std::function<void()> make;
        std::string error;
    };
    std::string const damaged =
        "it is no mailing file, or its index is damaged; \"vlmail pack salvage\" saves what "
        "is left of it [mailing-damaged]";
    Case const cases[] = {
        {"not there", [] {}, "No such file or directory; check the name [file-unreadable]"},
        {"a folder", [&] { fs::create_directory(file_); },
         "it is no file; name a mailing file [file-unreadable]"},
        {"empty", [&] { fs::remove(file_), write(""); }, damaged},
        {"another format", [&] { write(pdf("x")); }, damaged},
        {"a damaged index", [&] { pack(PAGES), damage(positionOf("<vantelar>")); }, damaged},
        {"cut short", [&] { pack(PAGES), fs::resize_file(file_, 100); }, damaged},
    };
    for (Case const& c : cases) {
        c.make();
        for (std::vector<std::string> const& arguments :
             {std::vector<std::string>{"list", file_.string()},
              {"verify", file_.string()},
              {"extract", file_.string(), "-o", (folder_ / "out").string()}}) {
            EXPECT_EQ(run(arguments), 1) << c.what;
            EXPECT_EQ(err_, "vlmail: cannot read " + quoted + ": " + c.error + '\n') << c.what;
            EXPECT_EQ(out_, "") << c.what;
        }
    }
}

TEST_F(PackVerify, TellsThatAllIsWhole) {
    pack(PAGES);
    EXPECT_EQ(run({"verify", file_.string()}), 0);
    EXPECT_EQ(out_, file_.string() + ": 3 pages of 2 documents, all whole\n");
    EXPECT_EQ(err_, "");
}

TEST_F(PackVerify, NamesThePageThatIsDamaged) {
    pack(PAGES);
    damage(lengthOfPage(PAGES[0]) + 15);
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_EQ(out_, file_.string() + ": damaged: page 2 of \"a.pdf\": its checksum is wrong\n" +
                        file_.string() + ": 3 pages of 2 documents, 1 blob damaged\n");
    EXPECT_EQ(err_, "");
}

TEST_F(PackVerify, NamesTheMetadata) {
    pack(PAGES);
    damage(lengthOfPage(PAGES[0]) + lengthOfPage(PAGES[1]) + lengthOfPage(PAGES[2]) + 15);
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_THAT(out_, StartsWith(file_.string() + ": damaged: the metadata: its checksum is wrong\n"));
}

TEST_F(PackVerify, FindsBlobsThatCannotBeExpanded) {
    // The checksum is that of the damaged blob.
    std::string blob = "TEZ" + std::string(8, '\1') + "no stream";
    PackWrapper out(file_.string(), PackWrapper::PURPOSE_OUTPUT, "m1");
    out.savePage("a.pdf", "1", SharedMemBuffer::copyOf(blob.data(), blob.size()));
    SharedMemBuffer const shortOfItsClaim = zipped("page");
    shortOfItsClaim.data()[3] = 5;
    out.savePage("a.pdf", "2", shortOfItsClaim);
    out.savePage("a.pdf", "3", SharedMemBuffer::copyOf("not compressed", 14));
    ASSERT_TRUE(out.finalizeOutput(zipped("{}")));
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_EQ(out_, file_.string() + ": damaged: page 1 of \"a.pdf\": it cannot be expanded\n" +
                        file_.string() + ": damaged: page 2 of \"a.pdf\": it cannot be expanded\n" +
                        file_.string() + ": 3 pages of 1 document, 2 blobs damaged\n");
}

TEST_F(PackVerify, FindsPagesBehindTheEndOfTheFile) {
    pack(PAGES);
    std::string bytes = read(file_);
    std::string const length = "length=\"" + std::to_string(lengthOfPage(PAGES[0])) + '"';
    bytes.replace(bytes.find(length), length.size(), "length=\"9999\"");
    // The index has kept its place but not its size; its place is all that the trailer tells.
    write(bytes);
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_THAT(out_, HasSubstr("damaged: page 1 of \"a.pdf\": it runs past the end of the file\n"));
}

TEST_F(PackVerify, FindsThatThereIsNoMetadata) {
    pack(PAGES);
    std::string bytes = read(file_);
    std::size_t const item = bytes.find("<mailitem name=\"DDT");
    std::size_t const end = bytes.find("/>", item) + 2;
    write(bytes.replace(item, end - item, std::string(end - item, ' ')));
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_EQ(out_, file_.string() + ": damaged: the metadata: it is missing\n" + file_.string() +
                        ": 3 pages of 2 documents, 1 blob damaged\n");
}

TEST_F(PackVerify, GoesOnWithTheNextFile) {
    pack(PAGES);
    EXPECT_EQ(run({"verify", "missing.mailing", file_.string()}), 1);
    EXPECT_EQ(err_, "vlmail: cannot read \"missing.mailing\": No such file or directory; check the name "
                    "[file-unreadable]\n");
    EXPECT_THAT(out_, EndsWith("all whole\n"));
}

TEST_F(PackVerify, RefusesAPageOfNoBytes) {
    PackWrapper out(file_.string(), PackWrapper::PURPOSE_OUTPUT, "m1");
    out.savePage("a.pdf", "1", zipped(pdf("x")));
    out.savePage("a.pdf", "2", {});
    out.savePage("a.pdf", "3", zipped(""));
    ASSERT_TRUE(out.finalizeOutput(
        metadataOf({{"a.pdf", "1", ""}, {"a.pdf", "2", ""}, {"a.pdf", "3", ""}}).toBlob()));
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_EQ(out_, file_.string() + ": damaged: page 2 of \"a.pdf\": it is empty\n" + file_.string() +
                        ": damaged: page 3 of \"a.pdf\": it is empty\n" + file_.string() +
                        ": 3 pages of 1 document, 2 blobs damaged\n");
    EXPECT_EQ(run({"extract", file_.string(), "-o", (folder_ / "out").string()}), 1);
    EXPECT_THAT(filesIn(folder_ / "out"), testing::SizeIs(2));
}

TEST_F(PackVerify, FindsEveryBitThatChangesWhatTheIndexSays) {
    packWithDigest(PAGES);
    EXPECT_EQ(run({"verify", file_.string()}), 0);
    std::string const before = indexOf(file_);
    std::size_t const begin = positionOf("<?xml") * 8, end = read(file_).size() * 8;
    for (std::size_t bit = begin; bit < end; ++bit) {
        flip(bit);
        bool const isTold = isToldAsDamaged();
        ASSERT_TRUE(isTold || indexOf(file_) == before) << "bit " << bit - begin;
        flip(bit);
    }
}

TEST_F(PackVerify, HoldsTheIndexOfAnOlderMailingAgainstItsMetadata) {
    pack({PAGES[0], PAGES[1], {"c.pdf", "1", pdf("c")}}, metadataOf(PAGES).toBlob());
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_EQ(out_, file_.string() + ": damaged: page 1 of \"c.pdf\": the metadata does not know it\n" +
                        file_.string() + ": damaged: page 1 of \"b.pdf\": it is missing\n" + file_.string() +
                        ": 3 pages of 2 documents, 2 blobs damaged\n");
    Mailing::Metadata metadata = metadataOf(PAGES);
    metadata.id = "m2";
    pack(PAGES, metadata.toBlob());
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_THAT(out_, HasSubstr(": damaged: the id: the index says \"m1\", the metadata \"m2\"\n"));
}

TEST_F(PackVerify, TellsPagesThatChangedPlacesByTheDigest) {
    packWithDigest(PAGES);
    std::string bytes = read(file_);
    std::size_t const first = bytes.find("name=\"1\""), second = bytes.find("name=\"2\"");
    std::swap(bytes[first + 6], bytes[second + 6]);
    write(bytes);
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_THAT(out_, StartsWith(file_.string() + ": damaged: the index: it is another than was written\n"));
}

TEST_F(PackVerify, LetsTheMetadataOfOtherProgramsBe) {
    pack(PAGES, zipped("not of ours"));
    EXPECT_EQ(run({"verify", file_.string()}), 0);
    EXPECT_EQ(out_, file_.string() + ": 3 pages of 2 documents, all whole\n");
}

TEST_F(PackVerify, FindsAPageThatPassesForTheMetadata) {
    packWithDigest(PAGES);
    std::string bytes = read(file_);
    std::string const page = "role=\"page\"", framework = "role=\"framework\"";
    bytes.replace(bytes.find(framework), framework.size(), page);
    bytes.replace(bytes.find(page), page.size(), framework);
    write(bytes);
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_THAT(out_,
                HasSubstr("damaged: the metadata: its entry in the index is another than was written\n"));
    EXPECT_THAT(out_, HasSubstr("damaged: page DDT440001.TDD of \"\": it has the name of the metadata\n"));
}

TEST_F(PackVerify, RefusesManyEmptyItemsInFewLines) {
    std::string const blob = textOf(zipped(pdf("x")));
    std::string items = item("1", 0, blob);
    for (int i = 0; i < 20'000; ++i)
        items += "<mailitem/>";
    forge(blob, items);
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_EQ(std::count(out_.begin(), out_.end(), '\n'), 52);
    EXPECT_THAT(out_, EndsWith(": 1 page of 1 document, 39999 blobs damaged\n"));
}

TEST_F(PackVerify, RefusesEntriesThatShareBytes) {
    std::string const blob = textOf(zipped(std::string(1 << 20, 'x')));
    std::string items;
    for (int i = 1; i <= 30; ++i)
        items += item(std::to_string(i), 0, blob);
    forge(blob + textOf(metadataOf({}).toBlob()),
          items + item("DDT440001.TDD", blob.size(), textOf(metadataOf({}).toBlob()), "framework"));
    EXPECT_EQ(run({"verify", file_.string()}), 1);
    EXPECT_THAT(out_, HasSubstr("page 2 of \"a.pdf\": its bytes belong to another as well\n"));
    EXPECT_THAT(out_, Not(HasSubstr("page 1 of \"a.pdf\": its bytes")));
    EXPECT_EQ(run({"extract", file_.string(), "-o", (folder_ / "out").string()}), 1);
    EXPECT_THAT(filesIn(folder_ / "out"), testing::SizeIs(2)) << "one page and the metadata";
}

TEST_F(PackExtract, LeavesOutWhatNoMailingExpandsTo) {
    std::string const blob = textOf(zipped(std::string(8 << 20, 'x')));
    std::string bytes, items;
    for (int i = 1; i <= 3; ++i) {
        items += item(std::to_string(i), bytes.size(), blob);
        bytes += blob;
    }
    forge(bytes, items);
    std::uint64_t const limit = (std::uint64_t{16} << 20) + 64 * fs::file_size(file_);
    EXPECT_EQ(run({"extract", file_.string(), "-o", (folder_ / "out").string()}), 1);
    EXPECT_EQ(err_, "vlmail: page 3 of \"a.pdf\" in \"" + file_.string() +
                        "\" is left out: the mailing expands to more than " + std::to_string(limit) +
                        " bytes [mailing-damaged]\n");
    EXPECT_EQ(filesIn(folder_ / "out").size(), 2U);
}

TEST_F(PackExtract, LeavesNoHalfFileOnAFullDisk) {
    VLServiceTest::SmallDisk const disk;
    if (!disk.whyNot().empty())
        GTEST_SKIP() << "no small disk: " << disk.whyNot();
    std::string noise;
    for (std::uint32_t i = 0, value = 1; i < 20'000; ++i, value = value * 1664525 + 1013904223)
        noise += static_cast<char>(value >> 24);
    pack({PAGES[0], {"b.pdf", "1", pdf(noise)}});
    EXPECT_EQ(run({"extract", file_.string(), "-o", disk.path()}), 1);
    EXPECT_EQ(err_, "vlmail: cannot write \"" + disk.path() +
                        "/b-1.pdf\": No space left on device; make room on the disk or name another folder "
                        "[file-unwritable]\n");
    EXPECT_EQ(read(disk.path() + "/a-1.pdf"), PAGES[0].content);
    EXPECT_EQ(std::distance(fs::directory_iterator(disk.path()), {}), 1);
}

TEST_F(PackList, IsAFailureWhenItCannotBeWritten) {
    pack(PAGES);
    std::ofstream full("/dev/full");
    std::ostringstream err;
    std::string const file = file_.string();
    char const* const argv[]{"vlmail", "pack", "list", file.c_str()};
    EXPECT_EQ(VlMail::run(4, argv, {full, err}), 1);
    EXPECT_EQ(err.str(), "vlmail: the results cannot be written; make room on the disk, or send them "
                         "elsewhere [file-unwritable]\n");
}

TEST_F(PackList, ShowsNoControlOfATerminal) {
    pack({{"a\u202Efdp.exe\xC2\x9B"
           "2J",
           "1", pdf("x")}});
    EXPECT_EQ(run({"list", file_.string()}), 0);
    EXPECT_THAT(out_, HasSubstr("a\\u202efdp.exe\\u009b2J"));
    EXPECT_EQ(run({"list", "--json", file_.string()}), 0);
    EXPECT_THAT(out_, HasSubstr("a\\u202efdp.exe\\u009b2J"));
    EXPECT_THAT(out_, Not(HasSubstr("\xC2\x9B")));
    EXPECT_EQ(run({"list", "no\x1b]0;x\x07"}), 1);
    EXPECT_THAT(err_, HasSubstr("no\\u001b]0;x\\u0007"));
}

TEST_F(PackExtract, WritesPagesAndMetadataExpanded) {
    pack(PAGES);
    fs::path const out = folder_ / "out";
    EXPECT_EQ(run({"extract", file_.string(), "-o", out.string()}), 0);
    EXPECT_EQ(out_, "4 files written into " + out.string() + '\n');
    std::ostringstream metadata;
    metadata << metadataOf(PAGES).toJson();
    EXPECT_THAT(filesIn(out),
                ElementsAre(Pair("a-1.pdf", PAGES[0].content), Pair("a-2.pdf", PAGES[1].content),
                            Pair("b-1.pdf", PAGES[2].content), Pair("metadata.json", metadata.str())));
}

TEST_F(PackExtract, NeverLeavesItsFolder) {
    pack({{"../../up.pdf", "1", pdf("a")},
          {"/etc/passwd", "1", "text"},
          {"..", "../x", "dots"},
          {"", "", "nothing"},
          {"a\nb", "1", "line break"},
          {std::string(300, 'l'), "1", "long"}},
         zipped("{}"));
    fs::path const out = folder_ / "out";
    EXPECT_EQ(run({"extract", file_.string(), "-o", out.string()}), 0);
    auto const files = filesIn(folder_.path());
    EXPECT_EQ(files.size(), 8u) << "the container, six pages and the metadata";
    for (auto const& [name, content] : files)
        EXPECT_TRUE(name == "m.mailing" ||
                    (name.starts_with("out/") && name.find('/', 4) == std::string::npos))
            << name;
    EXPECT_EQ(files.at("out/up-1.pdf"), pdf("a"));
    EXPECT_EQ(files.at("out/passwd-1.bin"), "text");
    EXPECT_EQ(files.at("out/_.-.._x.bin"), "dots");
    EXPECT_EQ(files.at("out/page-.bin"), "nothing");
    EXPECT_EQ(files.at("out/a_b-1.bin"), "line break");
}

TEST_F(PackExtract, KeepsPagesApartWhoseNamesBecomeTheSame) {
    pack({{"a.pdf", "1", "first"},
          {"x/a.pdf", "1", "second"},
          {"a.txt", "1", "third"},
          {"a.pdf", "1", "fourth"}});
    fs::path const out = folder_ / "out";
    EXPECT_EQ(run({"extract", file_.string(), "-o", out.string()}), 0);
    auto const files = filesIn(out);
    EXPECT_EQ(files.at("a-1.bin"), "first");
    EXPECT_EQ(files.at("a-1 (2).bin"), "second");
    EXPECT_EQ(files.at("a-1 (3).bin"), "third");
    EXPECT_EQ(files.at("a-1 (4).bin"), "fourth");
}

TEST_F(PackExtract, LeavesDamagedPagesOut) {
    pack(PAGES);
    damage(15);
    fs::path const out = folder_ / "out";
    EXPECT_EQ(run({"extract", file_.string(), "-o", out.string()}), 1);
    EXPECT_EQ(err_, "vlmail: page 1 of \"a.pdf\" in \"" + file_.string() +
                        "\" is left out: its checksum is wrong [mailing-damaged]\n");
    EXPECT_EQ(out_, "3 files written into " + out.string() + '\n');
    EXPECT_FALSE(filesIn(out).contains("a-1.pdf"));
}

TEST_F(PackExtract, WritesOverNothing) {
    pack(PAGES);
    fs::path const out = folder_ / "out";
    fs::create_directory(out);
    std::ofstream(out / "mine") << "mine";
    EXPECT_EQ(run({"extract", file_.string(), "-o", out.string()}), 1);
    EXPECT_EQ(err_, "vlmail: the folder \"" + out.string() +
                        "\" is not empty; name a new one with -o [file-exists]\n");
    EXPECT_THAT(filesIn(out), ElementsAre(Pair("mine", "mine")));

    EXPECT_EQ(run({"extract", file_.string(), "-o", file_.string()}), 1);
    EXPECT_THAT(err_, StartsWith("vlmail: cannot write into \"" + file_.string() + "\": "));
}

TEST_F(PackSalvage, KeepsAWholeFileAsItIs) {
    pack(PAGES);
    std::string const before = read(file_);
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 0);
    EXPECT_EQ(out_, "document  saved      named by\n"
                    "a.pdf     pages 1-2  the index\n"
                    "b.pdf     page 1     the index\n"
                    "3 pages of 2 documents and the metadata saved into " +
                        target_.string() + '\n');
    EXPECT_EQ(read(target_), before);
    EXPECT_EQ(read(file_), before);
}

TEST_F(PackSalvage, NeverWritesToItsInput) {
    pack(PAGES);
    std::string const before = read(file_);
    fs::path const link = folder_ / "link.mailing", hardLink = folder_ / "hard.mailing";
    fs::create_symlink(file_, link);
    fs::create_hard_link(file_, hardLink);
    for (fs::path const& target : {file_, link, hardLink}) {
        EXPECT_EQ(run({"salvage", file_.string(), "-o", target.string()}), 1);
        EXPECT_EQ(err_, "vlmail: \"" + target.string() +
                            "\" is the damaged file itself, which is never written to; name another with -o "
                            "[file-exists]\n");
    }
    std::ofstream(target_) << "mine";
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 1);
    EXPECT_EQ(err_,
              "vlmail: \"" + target_.string() + "\" is there already; name another with -o [file-exists]\n");
    EXPECT_EQ(read(target_), "mine");
    EXPECT_EQ(read(file_), before);
}

TEST_F(PackSalvage, TakesNamesFromTheItemsThatAreLeft) {
    pack(PAGES);
    damage(positionOf("<vantelar>"));
    damage(read(file_).size() - 8);
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 0);
    EXPECT_THAT(pagesIn(target_), ElementsAre(inOne(PAGES[0]), inOne(PAGES[1]), inOne(PAGES[2])));
    EXPECT_EQ(run({"verify", target_.string()}), 0);
}

TEST_F(PackSalvage, CompletesTheIndexFromTheMetadata) {
    pack(PAGES);
    // One item cannot be read any more.
    damage(positionOf("<mailitem name=\"2\"") + 2);
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 0);
    EXPECT_EQ(out_, "document  saved   named by\n"
                    "a.pdf     page 1  the index\n"
                    "a.pdf     page 2  the metadata\n"
                    "b.pdf     page 1  the index\n"
                    "3 pages of 2 documents and the metadata saved into " +
                        target_.string() + '\n');
    EXPECT_THAT(pagesIn(target_), ElementsAre(inOne(PAGES[0]), inOne(PAGES[1]), inOne(PAGES[2])));
}

TEST_F(PackSalvage, TakesAllNamesFromTheMetadataWhenTheIndexIsGone) {
    pack(PAGES);
    fs::resize_file(file_, positionOf("<?xml"));
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 0);
    EXPECT_THAT(out_, HasSubstr("a.pdf     pages 1-2  the metadata\n"));
    EXPECT_THAT(pagesIn(target_), ElementsAre(inOne(PAGES[0]), inOne(PAGES[1]), inOne(PAGES[2])));
    PackWrapper in(target_.string(), PackWrapper::PURPOSE_IMPORT, "");
    EXPECT_EQ(in.packId(), "m1");
    EXPECT_EQ(Mailing::Metadata::fromBlob(in.inputFullMeta()).toJson(), metadataOf(PAGES).toJson());
}

TEST_F(PackSalvage, DoesNotGuessWhichPageIsWhichInAGroupedMailing) {
    Mailing::Metadata metadata = metadataOf(PAGES);
    metadata.letters[0].documents.push_back({"c.pdf", {1}});
    std::vector<Page> pages = PAGES;
    pages.push_back({"c.pdf", "1", pdf("only of c")});
    pack(pages, metadata.toBlob());
    fs::resize_file(file_, positionOf("<?xml"));
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 2);
    EXPECT_THAT(out_, HasSubstr("salvaged  pages 1-4  nothing: numbered in file order\n"));
    EXPECT_THAT(out_, HasSubstr("lost: page 1 of \"c.pdf\": it was not found\n"));
    EXPECT_EQ(pagesIn(target_).at(3), "salvaged:4:" + pdf("only of c"));
}

TEST_F(PackSalvage, NumbersPagesWhenIndexAndMetadataAreGone) {
    pack(PAGES);
    fs::resize_file(file_, lengthOfPage(PAGES[0]) + lengthOfPage(PAGES[1]) + lengthOfPage(PAGES[2]));
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 2);
    EXPECT_EQ(out_, "document  saved      named by\n"
                    "salvaged  pages 1-3  nothing: numbered in file order\n"
                    "lost: the metadata: which pages belong to which letter is not known any more\n"
                    "3 pages of 1 document saved into " +
                        target_.string() + '\n');
    PackWrapper in(target_.string(), PackWrapper::PURPOSE_IMPORT, "");
    EXPECT_EQ(in.packId(), "m");
    EXPECT_EQ(Mailing::Metadata::fromBlob(in.inputFullMeta()).letters.size(), 0u);
}

TEST_F(PackSalvage, SaysWhichPageIsLost) {
    pack(PAGES);
    damage(lengthOfPage(PAGES[0]) + 15);
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 2);
    EXPECT_EQ(out_, "document  saved   named by\n"
                    "a.pdf     page 1  the index\n"
                    "b.pdf     page 1  the index\n"
                    "lost: page 2 of \"a.pdf\": its data is damaged\n"
                    "2 pages of 2 documents and the metadata saved into " +
                        target_.string() + '\n');
    EXPECT_THAT(pagesIn(target_), ElementsAre(inOne(PAGES[0]), inOne(PAGES[2])));
}

TEST_F(PackSalvage, FindsPagesBehindBytesThatWereLost) {
    pack(PAGES);
    // Bytes of the first page are missing, so that every offset in the index is wrong.
    std::string bytes = read(file_);
    write(bytes.erase(20, 7));
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 2);
    EXPECT_THAT(out_, HasSubstr("lost: page 1 of \"a.pdf\": its data is damaged\n"));
    EXPECT_THAT(pagesIn(target_), ElementsAre(inOne(PAGES[1]), inOne(PAGES[2])));
}

TEST_F(PackSalvage, MendsAHeaderThatTellsAWrongSize) {
    pack(PAGES);
    damage(5);
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 0);
    EXPECT_THAT(pagesIn(target_), ElementsAre(inOne(PAGES[0]), inOne(PAGES[1]), inOne(PAGES[2])));
    EXPECT_EQ(run({"verify", target_.string()}), 0);
}

TEST_F(PackSalvage, TellsOfDamagedDataWithoutAName) {
    pack(PAGES);
    damage(lengthOfPage(PAGES[0]) + 15);
    fs::resize_file(file_, positionOf("<?xml"));
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 2);
    EXPECT_THAT(out_, HasSubstr("lost: damaged data at byte " + std::to_string(lengthOfPage(PAGES[0])) +
                                ", of a page without a name\n"));
}

TEST_F(PackSalvage, SavesPagesThatWereStoredUncompressed) {
    PackWrapper out(file_.string(), PackWrapper::PURPOSE_OUTPUT, "m1");
    out.savePage("a.pdf", "1", zipped("compressed"));
    out.savePage("a.pdf", "2", SharedMemBuffer::copyOf("plain", 5));
    ASSERT_TRUE(out.finalizeOutput(metadataOf({}).toBlob()));
    damage(read(file_).size() - 8);
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 0);
    EXPECT_THAT(pagesIn(target_), ElementsAre("a.pdf:1:compressed", "a.pdf:2:plain"));
}

TEST_F(PackSalvage, TellsPagesOfTheSameBytesApartByTheirPlace) {
    pack({{"a.pdf", "1", pdf("same")}, {"b.pdf", "1", pdf("same")}, {"c.pdf", "1", pdf("same")}});
    damage(positionOf("<mailitem name=\"1\"") + 2);
    damage(read(file_).size() - 8);
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 0);
    EXPECT_THAT(pagesIn(target_),
                ElementsAre("a.pdf:1:" + pdf("same"), "b.pdf:1:" + pdf("same"), "c.pdf:1:" + pdf("same")));
}

TEST_F(PackSalvage, ReadsTheWideLayout) {
    pack(PAGES);
    std::string const whole = read(file_);
    std::size_t const index = whole.find("<?xml");
    std::string header;
    for (char c : std::string("Corbulet"))
        header += std::string{c, '\0'};
    header += std::string(2, '\0') + "????????" + std::string{'\2', '\0', '\0', '\0'} + "id?";
    // Cut behind the index: the trailer of that layout is gone.
    write(header + whole.substr(0, whole.size() - 8));
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 0);
    EXPECT_THAT(pagesIn(target_), ElementsAre(inOne(PAGES[0]), inOne(PAGES[1]), inOne(PAGES[2])));
    EXPECT_GT(index, 0u);
}

TEST_F(PackSalvage, MakesNamesFitForTheNewIndex) {
    pack({{"a.pdf", "1", pdf("x")}});
    std::string bytes = read(file_);
    bytes.replace(bytes.find("a.pdf", bytes.find("<?xml")), 5, "\xFF\x01.pd");
    write(bytes);
    damage(read(file_).size() - 8);
    EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 2)
        << "the metadata names another document";
    EXPECT_THAT(pagesIn(target_), ElementsAre("\xEF\xBF\xBD_.pd:1:" + pdf("x")));
}

TEST_F(PackSalvage, SaysWhenNothingCanBeSaved) {
    for (std::string const bytes : {"", "TEZ", "no mailing at all", "TEZ12345678x\x9C"}) {
        write(bytes);
        EXPECT_EQ(run({"salvage", file_.string(), "-o", target_.string()}), 1);
        EXPECT_EQ(err_, "vlmail: nothing in \"" + file_.string() +
                            "\" can be saved: it holds no page that is whole [mailing-damaged]\n");
        EXPECT_FALSE(fs::exists(target_));
    }
}

TEST_F(PackSalvage, SavesFromAFileCutAnywhere) {
    pack(PAGES);
    for (std::size_t size = read(file_).size(); size-- > lengthOfPage(PAGES[0]);) {
        fs::resize_file(file_, size);
        std::vector<std::string> const saved = contentsThatWouldBeSaved();
        EXPECT_TRUE(
            std::equal(saved.begin(), saved.end(), PAGES.begin(),
                       [](std::string const& content, Page const& page) { return content == page.content; }))
            << size;
        EXPECT_FALSE(saved.empty()) << size;
    }
}

TEST_F(PackSalvage, NeverSavesOtherBytesThanWereWritten) {
    pack(PAGES);
    std::string const whole = read(file_);
    for (std::size_t bit = 0; bit < whole.size() * 8; ++bit) {
        flip(bit);
        std::vector<std::string> const saved = contentsThatWouldBeSaved();
        EXPECT_GE(saved.size(), 2u) << "bit " << bit;
        for (std::string const& content : saved)
            EXPECT_TRUE(std::any_of(PAGES.begin(), PAGES.end(),
                                    [&](Page const& page) { return page.content == content; }))
                << "bit " << bit << ": " << content;
        flip(bit);
    }
}

} // namespace
