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

    static std::string fieldsOf(MailingBuilder const& mailing, std::size_t group) {
        std::ostringstream text;
        text << mailing.metadata().letters.at(group).fields.serialize();
        return text.str();
    }

    SavedPages saved_;
};

TEST_F(MailingBuilderTest, StoresPagesUnderTheirNumbers) {
    MailingBuilder mailing = builder();
    mailing.add("a.pdf", {{2, 3}, letter("x").fields, {}, {{2, {}}, {3, {}}}});
    EXPECT_EQ(saved_.names, (std::vector<std::string>{"a.pdf:2", "a.pdf:3"}));
    EXPECT_EQ(mailing.metadata().letters.at(0).documents.at(0).pages, (std::vector<int>{2, 3}));
}

TEST_F(MailingBuilderTest, GroupsLettersThatAgree) {
    MailingBuilder mailing = builder();
    mailing.add("a.pdf", letter("x"));
    mailing.add("b.pdf", letter("y"));
    mailing.add("c.pdf", letter("x"));
    ASSERT_EQ(mailing.metadata().letters.size(), 2u);
    EXPECT_EQ(mailing.metadata().letters[0].documents.size(), 2u);
    EXPECT_EQ(mailing.metadata().letters[0].documents[1].document, "c.pdf");
    EXPECT_EQ(mailing.letterCount(), 3u);
}

TEST_F(MailingBuilderTest, GroupsNothingWhenThePackPresetSaysSo) {
    MailingBuilder mailing = builder(preset(R"(, "no_group": true)"));
    mailing.add("a.pdf", letter("x"));
    mailing.add("c.pdf", letter("x"));
    EXPECT_EQ(mailing.metadata().letters.size(), 2u);
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
    ASSERT_EQ(mailing.metadata().letters.size(), 2u);
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
    Mailing::Metadata const back = Mailing::Metadata::fromBlob(mailing.metadata().toBlob());
    EXPECT_EQ(back.toJson(), mailing.metadata().toJson());
    EXPECT_EQ(back.packPreset, preset(R"(, "duplex": true, "extra": 1)"));
    EXPECT_EQ(back.id, "id");
    EXPECT_EQ(back.created, 7);
}

} // namespace
