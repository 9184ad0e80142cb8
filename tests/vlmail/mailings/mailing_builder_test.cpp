#include "programs/vlmail/mailings/mailing_builder.h"

#include "vlservice/json/json_text.h"

#include <gtest/gtest.h>

#include <sstream>

namespace {

using VlMail::LetterReading;
using VlMail::MailingBuilder;

struct SavedPages : PageSaverI {
    SavedPages() : PageSaverI("id") {}
    void savePage(std::string const& document, std::string const& page, SharedMemBuffer) override {
        names.push_back(document + ':' + page);
    }
    std::vector<std::string> names;
};

class MailingBuilderTest : public testing::Test {
protected:
    static json::Object parse(std::string const& text) { return json::strToObject(text.data(), text.size()); }

    static LetterReading letter(std::string const& address, std::string const& otherFields = "") {
        std::string const text = R"({"f": [{"name": "postal", "value": ")" + address +
                                 R"(", "priority": 1, "send_to_server": true})" + otherFields + "]}";
        return {{1}, Cfg::ExtractedFields(parse(text).get("f").toArray()), {}, {{1, {}}}};
    }
    static Cfg::PackPreset preset(std::string const& more = "") {
        return Cfg::PackPreset(parse(R"({"name": "P")" + more + "}"), {});
    }
    MailingBuilder builder(Cfg::PackPreset const& packPreset = preset()) {
        return {saved_, "id", packPreset, 7};
    }

    static std::string fieldsOf(MailingBuilder& mailing, std::size_t group) {
        std::ostringstream text;
        text << mailing.finish().letters.at(group).fields.serialize();
        return text.str();
    }

    SavedPages saved_;
};

TEST_F(MailingBuilderTest, StoresPagesUnderTheirNumbers) {
    MailingBuilder mailing = builder();
    mailing.add("a.pdf", {{2, 3}, letter("x").fields, {}, {{2, {}}, {3, {}}}});
    EXPECT_EQ(saved_.names, (std::vector<std::string>{"a.pdf:2", "a.pdf:3"}));
    EXPECT_EQ(mailing.finish().letters.at(0).documents.at(0).pages, (std::vector<int>{2, 3}));
}

TEST_F(MailingBuilderTest, GroupsLettersThatAgree) {
    MailingBuilder mailing = builder();
    mailing.add("a.pdf", letter("x"));
    mailing.add("b.pdf", letter("y"));
    mailing.add("c.pdf", letter("x"));
    ASSERT_EQ(mailing.finish().letters.size(), 2u);
    EXPECT_EQ(mailing.finish().letters[0].documents.size(), 2u);
    EXPECT_EQ(mailing.finish().letters[0].documents[1].document, "c.pdf");
    EXPECT_EQ(mailing.letterCount(), 3u);
}

TEST_F(MailingBuilderTest, GroupsNothingWhenThePackPresetSaysSo) {
    MailingBuilder mailing = builder(preset(R"(, "no_group": true)"));
    mailing.add("a.pdf", letter("x"));
    mailing.add("c.pdf", letter("x"));
    EXPECT_EQ(mailing.finish().letters.size(), 2u);
}

TEST_F(MailingBuilderTest, MergesTheValuesOfAGroup) {
    MailingBuilder mailing = builder();
    std::string const two = R"(,{"name": "n", "value": 2, "ignore_on_group": 1})";
    std::string const three = R"(,{"name": "n", "value": 3, "ignore_on_group": 1})";
    mailing.add("a.pdf", letter("x", two));
    mailing.add("b.pdf", letter("x", three));
    EXPECT_EQ(fieldsOf(mailing, 0), R"([{"name":"postal","value":"x","priority":1,"send_to_server":true},)"
                                    R"({"name":"n","value":5,"ignore_on_group":1}])");
}

TEST_F(MailingBuilderTest, LeavesALetterAloneWhoseValuesCannotBeMerged) {
    MailingBuilder mailing = builder();
    std::string const list = R"(,{"name": "l", "value": ["p"], "ignore_on_group": 6})";
    mailing.add("a.pdf", letter("x", list + R"(,{"name": "n", "value": 2, "ignore_on_group": 1})"));
    std::string const before = fieldsOf(mailing, 0);
    mailing.add("b.pdf", letter("x", list + R"(,{"name": "n", "value": "2", "ignore_on_group": 1})"));
    ASSERT_EQ(mailing.finish().letters.size(), 2u);
    EXPECT_EQ(fieldsOf(mailing, 0), before);
}

TEST_F(MailingBuilderTest, TellsDocumentsOfOneNameApart) {
    MailingBuilder mailing = builder();
    EXPECT_EQ(mailing.nameFor("a.pdf"), "a.pdf");
    EXPECT_EQ(mailing.nameFor("a.pdf"), "a (2).pdf");
    EXPECT_EQ(mailing.nameFor("a (2).pdf"), "a (2) (2).pdf");
    EXPECT_EQ(mailing.nameFor("a.pdf"), "a (3).pdf");
}

TEST_F(MailingBuilderTest, WritesMetadataThatReadsBack) {
    MailingBuilder mailing = builder(preset(R"(, "duplex": true, "extra": 1)"));
    mailing.add("a.pdf", letter("x"));
    Mailing::Metadata const back = Mailing::Metadata::fromBlob(mailing.finish().toBlob());
    EXPECT_EQ(back.toJson(), mailing.finish().toJson());
    EXPECT_EQ(back.packPreset, preset(R"(, "duplex": true, "extra": 1)"));
    EXPECT_EQ(back.id, "id");
    EXPECT_EQ(back.created, 7);
}

/// A blob that is worth to be looked at.
SharedMemBuffer blobOf(char content) {
    std::string const bytes(20'000, content);
    return SharedMemBuffer::copyOf(bytes.data(), bytes.size());
}

TEST_F(MailingBuilderTest, StoresLargePagesOfADocumentThatAreTheSameOnce) {
    MailingBuilder mailing = builder();
    mailing.add("a.pdf", {{1, 2}, letter("x").fields, {}, {{1, blobOf('a')}, {2, blobOf('p')}}});
    mailing.add("a.pdf", {{3, 4}, letter("y").fields, {}, {{3, blobOf('b')}, {4, blobOf('p')}}});
    mailing.add("b.pdf", {{1}, letter("z").fields, {}, {{1, blobOf('p')}}});
    EXPECT_EQ(saved_.names, (std::vector<std::string>{"a.pdf:1", "a.pdf:2", "a.pdf:3", "b.pdf:1"}));
    EXPECT_EQ(mailing.finish().letters.at(1).documents.at(0).pages, (std::vector<int>{3, 2}));
}

TEST_F(MailingBuilderTest, CountsSheetsAndColouredPagesOfAllParts) {
    MailingBuilder mailing = builder(preset(R"(, "duplex": true, "attachments": ["t"])"));
    mailing.useDocuments({{"t", "t.pdf", {{1, {}, {}, {21000, 29700}, true}}}}, {{"t", "/t.pdf", "ab"}});
    LetterReading coloured = letter("x");
    coloured.blobs[0].isColoured = true;
    coloured.blobs[0].size = {21000, 29700};
    mailing.add("a.pdf", coloured);
    mailing.add("b.pdf", coloured);
    mailing.add("c.pdf", letter("y"));
    Mailing::Metadata const& metadata = mailing.finish();
    EXPECT_TRUE(metadata.madeReady);
    EXPECT_EQ(metadata.letters.at(0).sheets, 3);
    EXPECT_EQ(metadata.letters.at(0).colouredPages, 2) << "the later letter has another page";
    EXPECT_EQ(metadata.letters.at(1).sheets, 2);
    EXPECT_EQ(metadata.letters.at(1).colouredPages, 1);
    EXPECT_EQ(metadata.usedDocuments.at(0).id, "t");
    EXPECT_EQ(Mailing::Metadata::fromBlob(metadata.toBlob()).toJson(), metadata.toJson());
}

TEST_F(MailingBuilderTest, StoresABlankSideForEachSizeOfPage) {
    MailingBuilder mailing = builder(preset(R"(, "duplex": true)"));
    auto const sized = [](int width) {
        LetterReading made = letter("x");
        made.blobs[0].size = {width, 29700};
        return made;
    };
    mailing.nameFor("blank");
    for (int const width : {21000, 21000, 20000, 21000})
        mailing.add(mailing.nameFor("a.pdf"), sized(width));
    mailing.finish();
    EXPECT_EQ(saved_.names, (std::vector<std::string>{"a.pdf:1", "a (2).pdf:1", "a (3).pdf:1", "a (4).pdf:1",
                                                      "blank (2):1", "blank (2):2"}));
    std::vector<Mailing::DocumentPages> const& documents = mailing.metadata().letters.at(0).documents;
    ASSERT_EQ(documents.size(), 7U);
    EXPECT_EQ(documents[5].pages, std::vector<int>{2});
    EXPECT_EQ(documents[5].role, Mailing::DocumentPages::Role::Blank);
    EXPECT_EQ(documents[3].pages, std::vector<int>{1});
}

} // namespace
