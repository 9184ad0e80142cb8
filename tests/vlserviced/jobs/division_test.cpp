#include "programs/vlserviced/jobs/division.h"

#include "programs/vlserviced/jobs/letter_parcel.h"
#include "programs/vlserviced/jobs/outbox_mailing.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/letter_help.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>

namespace {

namespace fs = std::filesystem;

using testing::ElementsAre;
using testing::IsEmpty;
using VlServiced::DividedLetter;
using VlServiced::LetterSource;
using VlServiced::MadeParcel;
using VlServiced::OutboxMailing;
using VlServiced::StoredLetter;

class Dividing : public testing::Test {
protected:
    VlServiced::Division divided(VlServiced::Notifying notifying) {
        return VlServiced::divide(
            container_, rest_, [](std::string const& channel) { return channel == "postal"; }, notifying);
    }
    std::vector<std::string> divided() {
        std::vector<std::string> letters;
        for (DividedLetter const& letter : divided(VlServiced::Notifying::No).letters)
            letters.push_back(std::to_string(letter.number) + ' ' + letter.channel +
                              (letter.byCarrier ? " carried" : ""));
        return letters;
    }
    static StoredLetter stored(long long number, std::string const& channel = "postal") {
        StoredLetter letter;
        letter.id = {"p1", number};
        letter.channel = channel;
        return letter;
    }

    TemporaryFolder folder_;
    fs::path container_ = folder_ / "p1.mailing";
    fs::path rest_ = folder_ / "rest" / "p1.mailing";
};

TEST_F(Dividing, TellsEachLettersChannelByItsPrimaryAddress) {
    writeLetters(container_, "p1", {"postal", "email", "", "postal"});
    EXPECT_THAT(divided(), ElementsAre("1 postal carried", "2 email", "3 ", "4 postal carried"));
}

TEST_F(Dividing, LeavesTheOthersInAContainerOfTheirOwn) {
    writeLetters(container_, "p1", {"postal", "email", "postal", "fax"});
    divided();
    OutboxMailing rest(rest_);
    EXPECT_EQ(rest.id(), "p1");
    ASSERT_EQ(rest.letters().size(), 2U);
    EXPECT_EQ(rest.letters().letter(0).fields.primaryAddressField()->name(), "email");
    EXPECT_EQ(rest.letters().letter(1).fields.primaryAddressField()->name(), "fax");
    EXPECT_EQ(rest.letters().mailing().packPreset.name(), "Bills");
    EXPECT_TRUE(rest.letters().mailing().madeReady);
    EXPECT_EQ(unzipped(rest.blob(rest.entryOf("letter 2.pdf", 1))), pdfOfLetter(2));
    EXPECT_EQ(failureOf([&] { rest.entryOf("letter 1.pdf", 1); }), "a page is not in the container");
}

TEST_F(Dividing, WritesNoContainerWhereAllOrNoneAreCarried) {
    for (char const* const channel : {"postal", "email"}) {
        writeLetters(container_, "p1", {channel, channel});
        divided();
        EXPECT_FALSE(fs::exists(rest_)) << channel;
    }
}

TEST_F(Dividing, LeavesAMailingAsItIsWhosePagesAreNotThoseThatArePrinted) {
    Mailing::Metadata mailing = lettersOf("p1", {"postal"});
    mailing.madeReady = false;
    Mailing::ContainerWriter writer(container_, "p1");
    saveLetters(writer, mailing);
    writer.finish(mailing.toBlob(), "");
    EXPECT_THAT(divided(), IsEmpty());
}

TEST_F(Dividing, FailsWithoutAContainer) {
    EXPECT_EQ(failureOf([&] { divided(); }), "the container " + container_.string() + " cannot be read");
    std::ofstream(container_) << "no container";
    EXPECT_EQ(failureOf([&] { divided(); }), "the container " + container_.string() + " cannot be read");
}

TEST_F(Dividing, FailsWithMetadataThatIsNoneOfAMailing) {
    Mailing::ContainerWriter writer(container_, "p1");
    writer.savePage("a.pdf", "1", zipped("x"));
    writer.finish(zipped("[]"), "");
    EXPECT_EQ(failureOf([&] { divided(); }),
              "the metadata of the container " + container_.string() + " is none of a mailing");
}

TEST_F(Dividing, MakesUpALetterAsItsCarrierTakesIt) {
    writeLetters(container_, "p1", {"postal", "email"});
    LetterSource source(folder_.path(), "p1");
    MadeParcel const made = source.parcelOf({stored(2, "email")}, "p1-2");
    EXPECT_THAT(made.bad, IsEmpty());
    EXPECT_EQ(made.parcel.key, "p1-2");
    EXPECT_EQ(made.parcel.mailing, "p1");
    EXPECT_EQ(made.parcel.pages, 1);
    ASSERT_EQ(made.parcel.letters.size(), 1U);
    Carriers::OutgoingLetter const& letter = made.parcel.letters.front();
    EXPECT_EQ(letter.number, 2);
    EXPECT_EQ(letter.key, "p1-2");
    EXPECT_EQ(letter.address, "to 2");
    EXPECT_THAT(letter.fields, ElementsAre(testing::Pair("email", "to 2")));
    EXPECT_EQ(letter.firstPage, 1);
    EXPECT_EQ(letter.sheets, 1);
    EXPECT_THAT(made.parcel.document, testing::StartsWith("%PDF-"));
}

TEST_F(Dividing, BeginsEachLetterOnASheetOfItsOwn) {
    for (char const* const preset : {"", "\"duplex\": true, "}) {
        writeLetters(container_, "p1", {"postal", "postal", "postal"}, preset);
        LetterSource source(folder_.path(), "p1");
        MadeParcel const made = source.parcelOf({stored(1), stored(2), stored(3)}, "p1-postal");
        long long const apart = *preset ? 2 : 1;
        EXPECT_EQ(made.parcel.isDuplex, *preset != '\0');
        EXPECT_EQ(made.parcel.pages, 1 + 2 * apart);
        for (std::size_t i = 0; i < 3; ++i)
            EXPECT_EQ(made.parcel.letters.at(i).firstPage, 1 + static_cast<long long>(i) * apart);
    }
}

TEST_F(Dividing, MakesFilesOfAttachmentsThatGoApart) {
    using Role = Mailing::DocumentPages::Role;
    Mailing::Metadata mailing = lettersOf("p1", {"email"}, R"("customer_email": "service@acme.example", )");
    std::vector<Mailing::DocumentPages>& documents = mailing.letters.front().documents;
    documents.push_back({"blank", {1}, Role::Blank});
    documents.push_back({"../terms of trade", {1, 2}, Role::Attachment});
    documents.push_back({"prices.pdf", {1}, Role::Attachment});
    Mailing::ContainerWriter writer(container_, "p1");
    saveLetters(writer, mailing);
    for (auto const& [document, page] : {std::pair{"blank", "1"}, std::pair{"../terms of trade", "1"},
                                         std::pair{"../terms of trade", "2"}, std::pair{"prices.pdf", "1"}})
        writer.savePage(document, page, zipped(pdfOfLetter(7)));
    writer.finish(mailing.toBlob(), "");
    LetterSource source(folder_.path(), "p1");
    MadeParcel const apart = source.parcelOf({stored(1, "email")}, "p1-1", LetterSource::Attachments::Apart);
    EXPECT_THAT(apart.bad, IsEmpty());
    EXPECT_EQ(apart.parcel.pages, 1);
    EXPECT_EQ(apart.parcel.replyTo, "service@acme.example");
    ASSERT_EQ(apart.parcel.attachments.size(), 2U);
    EXPECT_EQ(apart.parcel.attachments[0].first, "_._terms of trade.pdf");
    EXPECT_EQ(apart.parcel.attachments[1].first, "prices.pdf");
    EXPECT_THAT(apart.parcel.attachments[1].second, testing::StartsWith("%PDF-"));
    MadeParcel const printed = source.parcelOf({stored(1, "email")}, "p1-1");
    EXPECT_EQ(printed.parcel.pages, 5);
    EXPECT_THAT(printed.parcel.attachments, IsEmpty());
}

TEST_F(Dividing, LeavesOutLettersThatCanNeverGoOut) {
    Mailing::Metadata mailing = lettersOf("p1", {"postal", "postal", "postal", "postal"});
    mailing.letters[1].documents.front().pages = {1, 7};
    mailing.letters[3].documents.clear();
    Mailing::ContainerWriter writer(container_, "p1");
    writer.savePage("letter 1.pdf", "1", zipped(pdfOfLetter(1)));
    writer.savePage("letter 2.pdf", "1", zipped(pdfOfLetter(2)));
    writer.savePage("letter 3.pdf", "1", zipped("no PDF"));
    writer.finish(mailing.toBlob(), "");
    LetterSource source(folder_.path(), "p1");
    MadeParcel const made =
        source.parcelOf({stored(1), stored(2), stored(3), stored(4), stored(5)}, "p1-postal");
    ASSERT_EQ(made.parcel.letters.size(), 1U);
    EXPECT_EQ(made.parcel.pages, 1);
    std::vector<std::string> bad;
    for (VlServiced::BadLetter const& letter : made.bad)
        bad.push_back(letter.id.key() + ": " + letter.why);
    EXPECT_THAT(bad, ElementsAre("p1-2: a page is not in the container", "p1-3: a page is no page of a PDF",
                                 "p1-4: the letter has no pages",
                                 "p1-5: what the mailing says of the letter cannot be read"));
}

} // namespace
