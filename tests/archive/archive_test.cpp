// Files that each version of the programs has written are read by this one. tests/archive has a folder a
// form, with what the programs of that version made of the documents in tests/archive/letters; none is ever
// made anew.
#include "programs/mailing/metadata.h"
#include "programs/mailing/pack_database.h"
#include "programs/vlmail/mailings/plan.h"
#include "programs/vlmail/pack/container_check.h"
#include "programs/vlserviced/jobs/container.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"
#include "tests/vlserviced/json_help.h"
#include "tests/vlserviced/service_process.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <sstream>

namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

fs::path const ARCHIVE = TEST_ARCHIVE;

std::vector<std::string> versions() {
    std::vector<std::string> names;
    for (fs::directory_entry const& entry : fs::directory_iterator(ARCHIVE))
        if (fs::exists(entry.path() / "service.db"))
            names.push_back(entry.path().filename().string());
    std::ranges::sort(names);
    return names;
}

std::string textOf(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

std::string describe(Mailing::Metadata const& metadata) {
    std::ostringstream text;
    text << metadata.packPreset.name() << '/' << metadata.packPreset.title() << ':';
    for (Mailing::MailedLetter const& letter : metadata.letters) {
        for (auto const& [priority, field] : letter.fields)
            text << ' ' << field.name() << '=' << field.rawValue();
        for (Mailing::DocumentPages const& document : letter.documents)
            for (int const page : document.pages)
                text << ", " << document.document << ' ' << page;
        text << ';';
    }
    return text.str();
}

std::vector<std::string> pagesOf(VlMail::ContainerFile& container) {
    std::vector<std::string> pages;
    for (unsigned long long i = 0; i < container.size(); ++i)
        if (VlMail::isPage(container.entry(i)))
            pages.push_back(container.entry(i).document + ' ' + container.entry(i).name);
    return pages;
}

class FilesOfAnOlderVersion : public testing::TestWithParam<std::string> {
protected:
    /// A copy, as its owner has it.
    fs::path copied(char const* name) const {
        fs::path const copy = folder_ / name;
        fs::copy_file(ARCHIVE / GetParam() / name, copy);
        fs::permissions(copy, fs::perms(0600));
        return copy;
    }

    TemporaryFolder folder_;
};

TEST_P(FilesOfAnOlderVersion, AreMailingsThatAreWhole) {
    VlMail::ContainerFile container(copied("bills.mailing"));
    EXPECT_THAT(VlMail::checkContainer(container).damages, IsEmpty());
    EXPECT_THAT(pagesOf(container), testing::ElementsAre("invoice 1.txt 1", "invoice 1.txt 2",
                                                         "invoice 1.txt 3", "invoice 2.txt 1"));
    PackWrapper source((folder_ / "bills.mailing").string(), PackWrapper::PURPOSE_IMPORT, "");
    Mailing::Metadata const metadata = Mailing::Metadata::fromBlob(source.inputFullMeta());
    EXPECT_EQ(metadata.id, container.packId());
    EXPECT_EQ(
        describe(metadata),
        "Invoices/Bills: postal=\"Ada\" number=17 total=2 date=1707091200, invoice 1.txt 1, invoice 1.txt "
        "2, invoice 2.txt 1; postal=\"Zoë\" number=18 total=7 date=1707004800, invoice 1.txt 3;");
}

TEST_P(FilesOfAnOlderVersion, ArePlansThatCanBeCarriedOut) {
    auto const plan = VlMail::Plan::fromFile(copied("plan.json"));
    ASSERT_THAT(plan.documents(), SizeIs(3));
    EXPECT_THAT(plan.documents()[0].reading.letters.value(), SizeIs(2));
    EXPECT_EQ(plan.documents()[0].reading.letters->at(1).whyNot(), "");
    EXPECT_EQ(plan.documents()[1].reading.packPreset, "Invoices");
    EXPECT_TRUE(plan.documents()[2].reading.isAttachment());
}

TEST_P(FilesOfAnOlderVersion, ArePackDatabasesThatAreFetched) {
    fs::path const database = copied("packs.db");
    auto const packs = Mailing::finishedPacks(database);
    ASSERT_THAT(packs, SizeIs(2));
    for (Mailing::StoredPack const& pack : packs) {
        fs::path const file = folder_ / "fetched.mailing";
        Mailing::PackDatabaseReader pages(folder_ / "packs.db", pack.info.id);
        VlServiced::writeContainer(pages, file);
        VlMail::ContainerFile container(file);
        EXPECT_THAT(VlMail::checkContainer(container).damages, IsEmpty());
        EXPECT_EQ(container.packId(), pack.info.id);
    }
}

TEST_P(FilesOfAnOlderVersion, AreDatabasesThatTheServiceGoesOnWith) {
    fs::create_directory(folder_ / "data");
    fs::permissions(folder_ / "data", fs::perms::owner_all);
    fs::rename(copied("service.db"), folder_ / "data" / "service.db");
    ServiceProcess const service(
        {"--data", (folder_ / "data").string(), "--no-discovery", "--local-packs", folder_.path().string()});
    auto const output = [&](std::vector<std::string> arguments) {
        arguments.insert(arguments.end(), {"--service", "127.0.0.1:" + std::to_string(service.port()),
                                           "--token", (folder_ / "data" / "token").string()});
        Ran const ran = runVlMail(arguments);
        EXPECT_EQ(ran.err, "");
        return ran.out;
    };
    EXPECT_EQ(output({"settings", "show", "u=bob/ou=sales/a=acme", "po", "--origin"}),
              "part  setting  value       from\n"
              "po    code     R-1         root\n"
              "po    expiry   1900000000  u=bob/ou=sales/a=acme\n");
    EXPECT_THAT(output({"settings", "show", "a=acme", "app"}),
                HasSubstr("\napp   max_letter_sheets       20\n"));
    EXPECT_THAT(output({"price", "3", "--json"}), HasSubstr(R"("total":115)"));
    std::string const jobs = output({"status"});
    EXPECT_THAT(jobs, HasSubstr("submitted"));
    EXPECT_THAT(jobs, HasSubstr("queued"));
    EXPECT_THAT(jobs, HasSubstr("Bills"));
}

INSTANTIATE_TEST_SUITE_P(Archive, FilesOfAnOlderVersion, testing::ValuesIn(versions()),
                         [](auto const& version) {
                             std::string name = "V" + version.param;
                             std::ranges::replace_if(
                                 name, [](unsigned char c) { return std::isalnum(c) == 0; }, '_');
                             return name;
                         });

TEST(SettingsOfOlderVersions, ReadTheSameLetters) {
    std::vector<std::string> arguments{"letter", "--json", "--settings",
                                       (ARCHIVE / "letters" / "settings.json").string()};
    for (char const* const document : {"invoice 1.txt", "invoice 2.txt", "terms.txt"})
        arguments.push_back((ARCHIVE / "letters" / document).string());
    Ran const ran = runVlMail(arguments);
    EXPECT_EQ(ran.err, "");
    EXPECT_EQ(ran.out, textOf(ARCHIVE / "letters" / "expected.jsonl"));
}

} // namespace
