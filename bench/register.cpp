// What the register of letters costs: a look-up among so many letters, the transaction that accepts a mailing
// of 200 letters with and without it, and the same with the mailing's pages, three a letter, which come
// first. For the decision that a letter's key stands in one table under a unique index: among 10 million a
// look-up is to cost at most twice that among a thousand. VLSERVICE_REGISTER_LETTERS sets another number than
// 10 million.
#include "programs/base/digest.h"
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/letter_register.h"
#include "programs/vlserviced/store/pack_store.h"
#include "programs/vlserviced/store/schema.h"

#include <benchmark/benchmark.h>

#include <cstddef>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;
using VlServiced::LetterRegister;

constexpr long long FEW = 1000;
constexpr long long IN_A_MAILING = 200;

long long many() {
    char const* const number = std::getenv("VLSERVICE_REGISTER_LETTERS");
    return number ? std::atoll(number) : 10'000'000;
}

std::string digest(long long letter) { return Base::sha256("letter " + std::to_string(letter)); }

std::vector<Mailing::LetterDigest> letters(long long from, long long count) {
    std::vector<Mailing::LetterDigest> all;
    for (long long i = 0; i < count; ++i)
        all.push_back({digest(from + i), i + 1});
    return all;
}

/// A register on the disk with so many letters. All but a thousand have keys that came about by chance, which
/// are sorted before they are entered: one by one they take too long.
class Filled {
public:
    explicit Filled(long long count) {
        Database::Transaction transaction(*database_);
        register_.enter({"p", "", 1, 2}, letters(0, FEW), LetterRegister::Known::Refused);
        database_->change(
            "WITH RECURSIVE n(number) AS (SELECT $1 UNION ALL SELECT number + 1 FROM n WHERE number < $2) "
            "INSERT INTO registered_letters SELECT hex(randomblob(22)), 0, 2, number, 2, 0 FROM n WHERE "
            "number < $2 ORDER BY 1",
            FEW, count);
        transaction.commit();
    }
    ~Filled() {
        database_.reset();
        fs::remove_all(folder_);
    }
    Filled(Filled const&) = delete;
    Filled& operator=(Filled const&) = delete;

    bool has(long long at) { return !register_.find({digest(at % FEW)}, 1).empty(); }
    /// A mailing with a job, with its letters where these are registered, and with its pages.
    void accept(bool isRegistered, bool hasPages) {
        std::string const pack = "accepted" + std::to_string(++accepted_);
        VlServiced::Job job;
        job.pack = {"channel", "packs", pack};
        auto const own = letters(FEW + accepted_ * IN_A_MAILING, IN_A_MAILING);
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
    fs::path folder_ = [] {
        std::string name = (fs::temp_directory_path() / "register-XXXXXX").string();
        return fs::path(::mkdtemp(name.data()));
    }();
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

void lookUp(benchmark::State& state) {
    Filled& among = filled(state.range(0));
    long long at = 0;
    for (auto _ : state)
        if (!among.has(at += 7'919))
            state.SkipWithError("a letter is not found");
}

void accept(benchmark::State& state) {
    Filled& to = filled(FEW);
    for (auto _ : state)
        to.accept(state.range(0) != 0, state.range(1) != 0);
}

} // namespace

BENCHMARK(lookUp)->ArgName("letters")->Arg(FEW)->Arg(many());
BENCHMARK(accept)->ArgNames({"registered", "pages"})->ArgsProduct({{0, 1}, {0, 1}});

BENCHMARK_MAIN();
