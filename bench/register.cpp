// What the register of letters costs: a look-up among so many letters, of one that is there and of one that
// is not, with how often it reads from the file; the transaction that accepts a mailing of 200 letters with
// and without it, and the same with the mailing's pages, three a letter, which come first. For the decision
// that a letter's key stands in one table under a unique index: among 10 million a look-up is to cost at most
// twice that among a thousand, and accepting at most 1.1 times as much with it. VLSERVICE_REGISTER_LETTERS
// sets another number than 10 million.
#include "programs/base/base64.h"
#include "programs/base/digest.h"
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/letter_register.h"
#include "programs/vlserviced/store/pack_store.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/temporary_folder.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <memory>
#include <random>
#include <string>
#include <string_view>
#include <vector>

namespace {

using VlServiced::LetterRegister;

constexpr long long FEW = 1000;
constexpr long long IN_A_MAILING = 200;
/// No letter has this number or a greater one.
constexpr long long NO_LETTER = 1'000'000'000'000;

long long many() {
    char const* const number = std::getenv("VLSERVICE_REGISTER_LETTERS");
    return number ? std::atoll(number) : 10'000'000;
}

/// How often this process has read from anything.
long long readsUntilNow() {
    std::ifstream in("/proc/self/io");
    long long reads = 0;
    for (std::string word; in >> word;)
        if (word == "syscr:")
            in >> reads;
    return reads;
}

std::string digest(long long letter) { return Base::sha256("letter " + std::to_string(letter)); }

std::vector<Mailing::LetterDigest> letters(long long from, long long count) {
    std::vector<Mailing::LetterDigest> all;
    for (long long i = 0; i < count; ++i)
        all.push_back({digest(from + i), i + 1});
    return all;
}

/// As those of letters are spread, in their order.
std::vector<std::string> keysByChance(long long count) {
    constexpr int WORDS = 4;
    std::mt19937_64 chance(1);
    std::vector<std::string> keys;
    for (long long i = 0; i < count; ++i) {
        std::array<std::uint64_t, WORDS> words;
        std::generate(words.begin(), words.end(), std::ref(chance));
        keys.push_back(
            Base::toBase64(std::string_view(reinterpret_cast<char const*>(words.data()), sizeof(words))));
    }
    std::sort(keys.begin(), keys.end());
    return keys;
}

/// A register on the disk with so many letters. All but a thousand have keys that came about by chance, which
/// are sorted before they are entered: in any other order they take too long.
class Filled {
public:
    explicit Filled(long long count) {
        Database::Transaction transaction(*database_);
        register_.enter({"p", "", 1, 2}, letters(0, FEW), LetterRegister::Known::Refused);
        long long number = FEW;
        for (std::string const& key : keysByChance(count - FEW))
            database_->change("INSERT INTO registered_letters (letter, turn, mailing, number, ends_at, "
                              "is_free) VALUES ($1, 0, 2, $2, 2, 0)",
                              key, ++number);
        transaction.commit();
    }

    bool has(std::string const& letter) { return !register_.find({letter}, 1).empty(); }
    /// Those of the next mailing.
    std::vector<Mailing::LetterDigest> nextLetters() {
        return letters(FEW + ++accepted_ * IN_A_MAILING, IN_A_MAILING);
    }
    /// A mailing with a job, with its letters where these are registered, and with its pages.
    void accept(std::vector<Mailing::LetterDigest> const& own, bool isRegistered, bool hasPages) {
        std::string const pack = "accepted" + std::to_string(accepted_);
        VlServiced::Job job;
        job.pack = {"channel", "packs", pack};
        if (hasPages)
            receive(pack);
        jobs_.together([&] {
            jobs_.accept(job);
            if (isRegistered)
                register_.enter({pack, "", 1, 2}, own, LetterRegister::Known::Refused);
        });
    }

private:
    /// As they come over a connection: about a MiB at once.
    void receive(std::string const& pack) {
        constexpr long long PAGES = 3 * IN_A_MAILING;
        constexpr std::size_t AT_ONCE = 50;
        std::string const page(20'000, 'p');
        std::string const sha256(Base::SHA256_DIGITS, 'a');
        auto const size = static_cast<long long>(page.size());
        packs_->add({{pack, "a=acme", "Bills"}, PAGES, (PAGES + 1) * size, sha256}, 1);
        long long const fence = packs_->takeHold(pack);
        std::vector<VlServiced::PagePiece> pieces;
        for (long long at = 0; at <= PAGES; ++at) {
            std::string const name = at < PAGES ? std::to_string(at + 1) : "";
            pieces.push_back({at, 0, page, VlServiced::KeptPage{name, name, size, sha256}});
            if (pieces.size() == AT_ONCE || at == PAGES) {
                packs_->store(pack, fence, pieces, 1);
                pieces.clear();
            }
        }
        packs_->complete(pack, fence, 1);
    }

    long long accepted_ = 0;
    TemporaryFolder folder_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::JobStore jobs_{*database_};
    LetterRegister register_{*database_};
    std::unique_ptr<VlServiced::PackStore> packs_ = VlServiced::openSqlitePackStore(folder_ / "packs.db");
};

Filled& filled(long long count) {
    static Filled few(FEW);
    if (count == FEW)
        return few;
    static Filled all(many());
    return all;
}

/// Of the thousand that are known, or of letters that would lie anywhere among all.
std::vector<std::string> someDigests(bool areThere) {
    constexpr long long SOME = 50'000;
    std::vector<std::string> digests;
    for (long long i = 1; i <= SOME; ++i)
        digests.push_back(digest(areThere ? i * 7'919 % FEW : NO_LETTER + i));
    return digests;
}

void lookUp(benchmark::State& state) {
    Filled& among = filled(state.range(0));
    bool const areThere = state.range(1) != 0;
    std::vector<std::string> const digests = someDigests(areThere);
    std::size_t at = 0;
    long long const before = readsUntilNow();
    for (auto _ : state)
        if (among.has(digests[at++ % digests.size()]) != areThere)
            state.SkipWithError("a letter is not what it should be");
    state.counters["reads"] =
        benchmark::Counter(static_cast<double>(readsUntilNow() - before), benchmark::Counter::kAvgIterations);
}

void accept(benchmark::State& state) {
    Filled& to = filled(FEW);
    for (auto _ : state) {
        state.PauseTiming();
        auto const own = to.nextLetters();
        state.ResumeTiming();
        to.accept(own, state.range(0) != 0, state.range(1) != 0);
    }
}

} // namespace

BENCHMARK(lookUp)->ArgNames({"letters", "there"})->ArgsProduct({{FEW, many()}, {1, 0}});
BENCHMARK(accept)->ArgNames({"registered", "pages"})->ArgsProduct({{0, 1}, {0, 1}});

BENCHMARK_MAIN();
