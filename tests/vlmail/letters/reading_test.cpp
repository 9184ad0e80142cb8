#include "programs/vlmail/letters/reading.h"

#include "programs/reader/document.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/preset_index.h"
#include "tests/support/temporary_folder.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <fstream>
#include <stdexcept>

namespace VlMail {
namespace {

using testing::ElementsAre;
using testing::Field;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using testing::StartsWith;

/// A document of two letters, of which the second has no address.
class Readings : public testing::Test {
protected:
    Readings() {
        std::ofstream(file_) << "Mail: a@b.example\nRef: 1\fmore\fRef: 2";
        std::string const text =
            R"({"presets": {"extract_presets": [{"own": true, "match": ".*", "pack_preset": "P", "zones": [
            {"name": "All", "location": {"right": 100000, "bottom": 100000}, "fields": [
            {"name": "email", "priority": 2, "send_to_server": true, "value_extract": "^Mail: (?<VAL>.*)$"},
            {"name": "ref", "mark": 1, "value_extract": "^Ref: (?<VAL>.*)$"}]}]}],
            "pack_presets": [{"own": true, "name": "P"}]}})";
        settings_ = NodeSettings::resolved(json::strToObject(text.data(), text.size()), "here");
    }

    ReadResult read(Along const& along) const {
        Cfg::Presets const presets = settings_.presets();
        return readDocument(file_, PresetIndex(presets), settings_, along, 1);
    }

    TemporaryFolder folder_;
    std::filesystem::path const file_ = folder_ / "a.txt";
    NodeSettings settings_;
};

TEST_F(Readings, HoldThePagesOfLettersThatCanGoOut) {
    ReadResult const result = read({.pages = Along::Pages::Yes});
    ASSERT_EQ(result.reading.error, "");
    ASSERT_THAT(result.reading.letters.value(), SizeIs(2));
    EXPECT_THAT(result.reading.letters->at(0).blobs,
                ElementsAre(Field(&PageBlob::number, 1), Field(&PageBlob::number, 2)));
    EXPECT_THAT(result.reading.letters->at(1).blobs, IsEmpty());
}

TEST_F(Readings, HoldTheDigestOfTheFileWhenAsked) {
    // printf 'Mail: a@b.example\nRef: 1\fmore\fRef: 2' | sha256sum
    EXPECT_EQ(read({.digest = Along::Digest::Yes}).sha256,
              "49ac7f28ea8ec3279befac214724ccdf2983301b913c99c233f2eb88a0680f3f");
    EXPECT_EQ(read({}).sha256, "");
}

TEST_F(Readings, HoldNoPagesUnlessAsked) {
    ReadResult const result = read({});
    ASSERT_THAT(result.reading.letters.value(), SizeIs(2));
    EXPECT_THAT(result.reading.letters->at(0).blobs, IsEmpty());
}

TEST_F(Readings, HoldBackALetterWhosePagesDiffer) {
    DocumentReading reading = read({}).reading;
    LetterReading& letter = reading.letters.value().at(0);
    EXPECT_EQ(letter.whyNot(), "");
    letter.differingPages = {2};
    EXPECT_EQ(letter.whyNot(),
              "page-differs: page 2 would not look like the document's; print it to a new PDF");
    letter.differingPages = {1, 2};
    DocumentReading const handedOver = DocumentReading::fromJson(reading.toJson());
    EXPECT_EQ(handedOver.letters.value().at(0).whyNot(),
              "page-differs: pages 1-2 would not look like the document's; print it to a new PDF");
    EXPECT_EQ(handedOver.letters->at(1).differingPages, std::vector<int>());
}

TEST_F(Readings, HaveTheCodeInFrontOfWhyALetterCannotGoOut) {
    DocumentReading reading = read({}).reading;
    LetterReading const ready = reading.letters.value().at(0);
    EXPECT_EQ(ready.codeOfWhyNot(), "");
    LetterReading differing = ready;
    differing.differingPages = {2};
    LetterReading joined = ready;
    joined.doubtfulJoins = {{2, "the mark is missing"}};
    LetterReading found = ready;
    found.findings = {{Production::Code::PageEmpty, Production::Severity::Error, {1}, {}, "x", "y"}};
    LetterReading refused = ready;
    refused.refusal = "too-many-sheets: 31 sheets, 5 allowed by u=bob/a=acme";
    for (LetterReading const* letter : {&differing, &joined, &found, &refused}) {
        EXPECT_THAT(letter->codeOfWhyNot(), Not(IsEmpty()));
        EXPECT_THAT(letter->whyNot(), StartsWith(letter->codeOfWhyNot() + ": "));
    }
    LetterReading lost = ready;
    lost.fields = {};
    EXPECT_EQ(lost.whyNot(), "no address to go to");
    EXPECT_EQ(lost.codeOfWhyNot(), "");
}

TEST_F(Readings, TakeWhatComesAlong) {
    Along along;
    along.beforeReading = [](ReadResult& result, Cfg::Presets const&) {
        result.report = result.reading.document;
    };
    along.afterReading = [](ReadResult& result, OpenDocument const& read) {
        result.report +=
            ": " + std::to_string(read.document.pageCount()) + " pages, place " + std::to_string(read.place);
    };
    EXPECT_EQ(read(along).report, "a.txt: 3 pages, place 1");
}

TEST_F(Readings, FailWithWhatComesAlong) {
    Along along;
    along.afterReading = [](ReadResult&, OpenDocument const&) { throw std::runtime_error("no picture"); };
    ReadResult const result = read(along);
    EXPECT_EQ(result.reading.error, "no picture");
    EXPECT_FALSE(result.reading.letters);
}

} // namespace
} // namespace VlMail
