#include "programs/vlserviced/store/letter_register.h"

#include "programs/base/base64.h"
#include "programs/base/digest.h"
#include "programs/base/hex.h"
#include "programs/vlserviced/store/letter_store.h"
#include "tests/vlserviced/store_database.h"

#include <gmock/gmock.h>

#include <future>
#include <memory>
#include <optional>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using VlServiced::Job;
using VlServiced::JobState;
using VlServiced::LetterRegister;
using VlServiced::LetterState;
using Known = LetterRegister::Known;

constexpr long long ACCEPTED_AT = 1000;
constexpr long long ENDS_AT = 2000;

class LetterRegisterTest : public VLServiceTest::OnEachDatabase {
protected:
    void SetUp() override {
        OnEachDatabase::SetUp();
        if (IsSkipped())
            return;
        register_.emplace(*database_);
    }

    static std::string digest(int letter) { return Base::sha256("letter " + std::to_string(letter)); }
    static std::vector<Mailing::LetterDigest> digests(std::vector<int> const& letters) {
        std::vector<Mailing::LetterDigest> all;
        for (int const letter : letters)
            all.push_back({digest(letter), static_cast<long long>(all.size()) + 1});
        return all;
    }
    std::vector<long long> enter(std::string const& pack, std::vector<int> const& letters,
                                 Known known = Known::Refused, long long at = ACCEPTED_AT) {
        Database::Transaction transaction(*database_);
        std::vector<long long> refused =
            register_->enter({pack, "a=acme", at, at + ENDS_AT - ACCEPTED_AT}, digests(letters), known);
        if (refused.empty())
            transaction.commit();
        return refused;
    }
    /// The packs that have them.
    std::vector<std::string> packsOf(std::vector<int> const& letters, long long now = ACCEPTED_AT) {
        std::vector<std::string> asked;
        for (int const letter : letters)
            asked.push_back(digest(letter));
        std::vector<std::string> packs;
        for (VlServiced::RegisteredLetter const& known : register_->find(asked, now))
            packs.push_back(known.mailing.pack + ' ' + std::to_string(known.number));
        return packs;
    }
    void accept(std::string const& pack) {
        Job job;
        job.pack = {"channel", "packs", pack};
        job.acceptedAt = ACCEPTED_AT;
        jobs_.emplace(*database_).accept(job);
    }
    long long rows() {
        return database_->number("SELECT (SELECT count(*) FROM registered_letters) + "
                                 "(SELECT count(*) FROM registered_mailings)");
    }

    std::optional<LetterRegister> register_;
    std::optional<VlServiced::JobStore> jobs_;
};

VLSERVICE_ON_EACH_DATABASE(LetterRegisterTest);

TEST_P(LetterRegisterTest, KnowsALetterAgainInWhateverMailing) {
    EXPECT_THAT(enter("p1", {1, 2}), IsEmpty());
    EXPECT_THAT(packsOf({1, 2, 3}), ElementsAre("p1 1", "p1 2"));
    EXPECT_THAT(enter("p2", {3, 2, 1}), ElementsAre(2, 3));
    EXPECT_THAT(packsOf({3}), IsEmpty()) << "of a mailing that is refused nothing is entered";
    EXPECT_THAT(enter("p2", {3}), IsEmpty());
}

TEST_P(LetterRegisterTest, TakesMoreLettersThanGoIntoOneStatement) {
    std::vector<int> many(250);
    for (int i = 0; i < 250; ++i)
        many[static_cast<std::size_t>(i)] = i;
    EXPECT_THAT(enter("p1", many), IsEmpty());
    EXPECT_EQ(packsOf(many).size(), 250U);
    EXPECT_EQ(enter("p2", many).size(), 250U);
}

TEST_P(LetterRegisterTest, RefusesTheSecondOfTheSameLettersInOneMailing) {
    EXPECT_THAT(enter("p1", {1, 2, 1}), ElementsAre(3));
    EXPECT_THAT(enter("p1", {1, 2, 1}, Known::SentAgain), IsEmpty());
    EXPECT_THAT(packsOf({1}), ElementsAre("p1 1"));
}

TEST_P(LetterRegisterTest, GivesLettersThatAreSentAgainToTheLaterMailing) {
    EXPECT_THAT(enter("p1", {1}), IsEmpty());
    EXPECT_THAT(enter("p2", {1}, Known::SentAgain), IsEmpty());
    EXPECT_THAT(packsOf({1}), ElementsAre("p2 1"));
}

TEST_P(LetterRegisterTest, KnowsALetterThatWasSentAgainUntilNeitherMailingHasIt) {
    for (std::string const pack : {"p1", "p2", "p3"})
        accept(pack);
    EXPECT_THAT(enter("p1", {1}), IsEmpty());
    EXPECT_THAT(enter("p2", {1}, Known::SentAgain), IsEmpty());
    EXPECT_THAT(enter("p3", {1}, Known::SentAgain), IsEmpty());
    EXPECT_TRUE(jobs_->cancel("p3", 1001));
    EXPECT_THAT(packsOf({1}), ElementsAre("p2 1"));
    EXPECT_TRUE(jobs_->cancel("p1", 1001));
    EXPECT_THAT(packsOf({1}), ElementsAre("p2 1"));
    EXPECT_THAT(enter("p4", {1}), ElementsAre(1));
    EXPECT_TRUE(jobs_->cancel("p2", 1001));
    EXPECT_THAT(packsOf({1}), IsEmpty());
    EXPECT_THAT(enter("p4", {1}), IsEmpty());
}

TEST_P(LetterRegisterTest, KnowsALetterThatWasSentAgainForLongerThanTheFirstTime) {
    EXPECT_THAT(enter("p1", {1}), IsEmpty());
    EXPECT_THAT(enter("p2", {1}, Known::SentAgain, ENDS_AT - 1), IsEmpty());
    while (register_->removeSome(ENDS_AT)) {
    }
    EXPECT_THAT(packsOf({1}, ENDS_AT), ElementsAre("p2 1"));
    EXPECT_THAT(enter("p3", {1}, Known::Refused, ENDS_AT), ElementsAre(1));
}

TEST_P(LetterRegisterTest, KnowsALetterAsLongAsItsMailingSays) {
    EXPECT_THAT(enter("p1", {1}), IsEmpty());
    EXPECT_THAT(packsOf({1}, ENDS_AT - 1), ElementsAre("p1 1"));
    EXPECT_THAT(packsOf({1}, ENDS_AT), IsEmpty());
    EXPECT_THAT(enter("p2", {1}, Known::Refused, ENDS_AT - 1), ElementsAre(1));
    EXPECT_THAT(enter("p2", {1}, Known::Refused, ENDS_AT), IsEmpty());
}

TEST_P(LetterRegisterTest, RemovesWhatIsPastAndNothingElse) {
    EXPECT_THAT(enter("p1", {1, 2}), IsEmpty());
    EXPECT_THAT(enter("p2", {3}, Known::Refused, ACCEPTED_AT + 1), IsEmpty());
    EXPECT_FALSE(register_->removeSome(ENDS_AT - 1));
    while (register_->removeSome(ENDS_AT)) {
    }
    EXPECT_EQ(rows(), 2);
    EXPECT_THAT(packsOf({1, 2, 3}), ElementsAre("p2 1"));
}

TEST_P(LetterRegisterTest, CountsThoseThatAreKnownAgainAndSaysWhenTheNextArePast) {
    EXPECT_EQ(register_->nextEnd(), std::nullopt);
    accept("p3");
    EXPECT_THAT(enter("p2", {3}, Known::Refused, ACCEPTED_AT + 1), IsEmpty());
    EXPECT_THAT(enter("p1", {1, 2}), IsEmpty());
    EXPECT_THAT(enter("p3", {4}), IsEmpty());
    EXPECT_TRUE(jobs_->cancel("p3", 1001));
    EXPECT_EQ(VlServiced::registeredLetters(*database_, ENDS_AT - 1), 3);
    EXPECT_EQ(VlServiced::registeredLetters(*database_, ENDS_AT), 1);
    EXPECT_EQ(register_->nextEnd(), ENDS_AT);
}

TEST_P(LetterRegisterTest, NoticesThatTheDatabaseHasAnotherSecret) {
    EXPECT_TRUE(register_->hasItsSecret());
    database_->change("UPDATE register_secret SET secret = $1", std::string(64, 'a'));
    EXPECT_FALSE(register_->hasItsSecret());
    database_->change("DELETE FROM register_secret");
    EXPECT_FALSE(register_->hasItsSecret());
}

TEST_P(LetterRegisterTest, FreesLettersOfMailingsThatAreCalledBackOrGivenUp) {
    accept("p1");
    accept("p2");
    EXPECT_THAT(enter("p1", {1}), IsEmpty());
    EXPECT_THAT(enter("p2", {2}), IsEmpty());
    EXPECT_TRUE(jobs_->cancel("p1", 1001));
    jobs_->fail("p2", "no pages", 1001);
    EXPECT_THAT(packsOf({1, 2}), IsEmpty());
    EXPECT_THAT(enter("p3", {1, 2}), IsEmpty());
    EXPECT_THAT(packsOf({1, 2}), ElementsAre("p3 1", "p3 2"));
}

TEST_P(LetterRegisterTest, FreesOfADividedMailingTheLettersThatFailedAlone) {
    accept("p1");
    VlServiced::LetterStore letters(*database_, *jobs_);
    jobs_->advance("p1", JobState::Accepted, JobState::Queued, 1001);
    EXPECT_THAT(enter("p1", {1, 2, 3}), IsEmpty());
    ASSERT_TRUE(letters.divide("p1", {{1, "email", true}, {2, "email", true}, {3, "paper", false}}, 1002));
    letters.finish({{"p1", 1}}, LetterState::Delivered, "", 1003);
    letters.finish({{"p1", 2}}, LetterState::Failed, "no such user", 1003);
    EXPECT_THAT(packsOf({1, 2, 3}), ElementsAre("p1 1", "p1 3"));
    jobs_->fail("p1", "the container is gone", 1004);
    EXPECT_THAT(packsOf({1, 2, 3}), ElementsAre("p1 1"));
}

TEST_P(LetterRegisterTest, KnowsALetterAgainThatIsTriedOnceMore) {
    accept("p1");
    VlServiced::LetterStore letters(*database_, *jobs_);
    jobs_->advance("p1", JobState::Accepted, JobState::Queued, 1001);
    EXPECT_THAT(enter("p1", {1}), IsEmpty());
    ASSERT_TRUE(letters.divide("p1", {{1, "email", true}}, 1002));
    letters.finish({{"p1", 1}}, LetterState::Failed, "no such user", 1003);
    EXPECT_THAT(packsOf({1}), IsEmpty());
    EXPECT_TRUE(letters.decide({"p1", 1}, {LetterState::Failed}, LetterState::Waiting, "", 1004));
    EXPECT_THAT(packsOf({1}), ElementsAre("p1 1"));
}

TEST_P(LetterRegisterTest, HasOneSecretForAllServicesAndNoDigestOfALetter) {
    EXPECT_THAT(enter("p1", {1}), IsEmpty());
    auto const other = open();
    EXPECT_EQ(LetterRegister(*other).find({digest(1)}, ACCEPTED_AT).size(), 1U);
    Database::Rows rows = database_->query("SELECT letter FROM registered_letters");
    ASSERT_TRUE(rows.next());
    std::string const key = rows.text(0);
    EXPECT_EQ(key.size(), 44U);
    EXPECT_NE(key, Base::toBase64(Base::fromHex(digest(1)).value()));
}

TEST_P(LetterRegisterTest, LetsOneOfTwoServicesWinThatAcceptTheSameLetter) {
    if (!isPostgres())
        GTEST_SKIP() << "one service has an SQLite database to itself";
    auto const other = open();
    LetterRegister second(*other);
    auto first = std::make_unique<Database::Transaction>(*database_);
    EXPECT_THAT(register_->enter({"p1", "", ACCEPTED_AT, ENDS_AT}, digests({1, 2}), Known::Refused),
                IsEmpty());
    // Waits for the first one, which is committed meanwhile.
    auto waiting = std::async(std::launch::async, [&] {
        Database::Transaction transaction(*other);
        return second.enter({"p2", "", ACCEPTED_AT, ENDS_AT}, digests({2, 1}), Known::Refused);
    });
    first->commit();
    first.reset();
    EXPECT_THAT(waiting.get(), ElementsAre(1, 2));
}

} // namespace
