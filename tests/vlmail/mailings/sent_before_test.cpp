#include "programs/vlmail/mailings/sent_before.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

namespace {

using testing::IsEmpty;

std::string letterDigest(std::size_t letter) { return Base::sha256("letter " + std::to_string(letter)); }

/// Noon in UTC.
constexpr long long THAT_DAY = 1'795'176'000;

Protocol::RegisteredLetter letterOf(std::string const& pack, std::string const& state) {
    Protocol::RegisteredLetter letter;
    letter.at = THAT_DAY;
    letter.pack = pack;
    letter.state = state;
    return letter;
}

TEST(ALetterThatWasSentBefore, IsToldWithItsDayItsMailingAndItsState) {
    EXPECT_EQ(VlMail::sentBeforeInWords(letterOf("p1", "delivered")),
              "sent-before: 2026-11-20 in p1, delivered");
    EXPECT_EQ(VlMail::sentBeforeInWords(letterOf("p1", "")), "sent-before: 2026-11-20 in p1");
    EXPECT_EQ(VlMail::sentBeforeInWords(letterOf("", "")), "sent-before: 2026-11-20 at another node");
}

TEST(LettersToBeSent, AreAskedForAThousandAtOnce) {
    std::vector<std::size_t> asked;
    VlMail::SentBefore sent(
        [&](Protocol::RegisterQuery const& query) {
            EXPECT_EQ(query.id, "a=acme");
            EXPECT_THAT(query.besides, testing::ElementsAre("p1"));
            asked.push_back(query.digests.size());
            Protocol::RegisterAnswer answer;
            answer.letters = {letterOf("p0", "queued")};
            answer.letters.front().digest = query.digests.back();
            return answer;
        },
        "a=acme", {"p1"});
    std::vector<std::string> digests;
    for (std::size_t letter = 0; letter < 2001; ++letter)
        digests.push_back(letterDigest(letter));
    auto const known = sent.of(digests);
    EXPECT_THAT(asked, testing::ElementsAre(1000, 1000, 1));
    EXPECT_EQ(known.size(), 3U);
    EXPECT_TRUE(known.contains(letterDigest(2000)));
    EXPECT_THAT(sent.of({}), IsEmpty());
    EXPECT_EQ(asked.size(), 3U) << "there is nothing to ask for";
}

VlMail::SentBefore refusedWith(Base::Code code) {
    return {[code](Protocol::RegisterQuery const&) -> Protocol::RegisterAnswer {
                throw Base::Error(code, "there is no query of that kind");
            },
            "a=acme",
            {}};
}

TEST(LettersToBeSent, AreAllNewToAnOlderServiceThatKeepsNoRegister) {
    for (Base::Code const code : {Base::Code::ServiceOutdated, Base::Code::ServiceRefused})
        EXPECT_THAT(refusedWith(code).of({letterDigest(1)}), IsEmpty()) << Base::nameOf(code);
}

TEST(LettersToBeSent, AreNotSentWhenTheServiceDoesNotSayWhetherItHadThem) {
    for (Base::Code const code :
         {Base::Code::NotAllowed, Base::Code::RequestInvalid, Base::Code::DatabaseFailed})
        EXPECT_THROW(refusedWith(code).of({letterDigest(1)}), Base::Error) << Base::nameOf(code);
}

} // namespace
