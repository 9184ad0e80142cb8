// What the register of letters costs: a look-up among so many letters, and the acceptance of a mailing of 200
// letters with and without it. For the decision that a letter's key stands in one table under a unique index:
// among 10 million a look-up is to cost at most twice that among a thousand, and an acceptance at most 1.1
// times that without the register. VLSERVICE_REGISTER_LETTERS sets another number than 10 million.
#include "programs/base/digest.h"
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/letter_register.h"
#include "programs/vlserviced/store/schema.h"

#include <benchmark/benchmark.h>

#include <algorithm>
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

/// A register on the disk with so many letters.
class Filled {
public:
    explicit Filled(long long count) : count_(count) {
        constexpr long long AT_ONCE = 100'000;
        Database::Transaction transaction(*database_);
        for (long long from = 0; from < count; from += AT_ONCE)
            register_.enter({"p" + std::to_string(from), "", 1, 2},
                            letters(from, std::min(AT_ONCE, count - from)), LetterRegister::Known::Refused);
        transaction.commit();
    }
    ~Filled() {
        database_.reset();
        fs::remove_all(folder_);
    }
    Filled(Filled const&) = delete;
    Filled& operator=(Filled const&) = delete;

    bool has(long long at) { return !register_.find({digest(at % count_)}, 1).empty(); }
    /// A mailing with a job, and with its letters where these are registered.
    void accept(bool isRegistered) {
        std::string const pack = "accepted" + std::to_string(++accepted_);
        VlServiced::Job job;
        job.pack = {"channel", "packs", pack};
        auto const own = letters(count_ + accepted_ * IN_A_MAILING, IN_A_MAILING);
        jobs_.together([&] {
            jobs_.accept(job);
            if (isRegistered)
                register_.enter({pack, "", 1, 2}, own, LetterRegister::Known::Refused);
        });
    }

private:
    long long count_;
    long long accepted_ = 0;
    fs::path folder_ = [] {
        std::string name = (fs::temp_directory_path() / "register-XXXXXX").string();
        return fs::path(::mkdtemp(name.data()));
    }();
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::JobStore jobs_{*database_};
    LetterRegister register_{*database_};
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
        to.accept(state.range(0) != 0);
}

} // namespace

BENCHMARK(lookUp)->ArgName("letters")->Arg(FEW)->Arg(many());
BENCHMARK(accept)->ArgName("registered")->Arg(0)->Arg(1);

BENCHMARK_MAIN();
