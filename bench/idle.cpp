// How much memory a service takes that has nothing to do, with and without somebody who may watch it: what is
// resident, its share of what others use too (libraries), and what is its own alone. Decides whether
// libraries and caches are worth loading late. The aim is 30 MiB resident.
#include <benchmark/benchmark.h>

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

namespace fs = std::filesystem;

/// A service on a data folder of its own, both of which are gone at the end.
class IdleService {
public:
    explicit IdleService(std::vector<std::string> more) {
        more.insert(more.begin(), {VLSERVICE_VLSERVICED, "--data", data_.string()});
        int ends[2];
        if (::pipe2(ends, O_CLOEXEC) != 0)
            throw std::runtime_error("no pipe");
        process_ = ::fork();
        if (process_ == 0)
            become(more, ends[1]);
        ::close(ends[1]);
        char first = 0;
        if (::read(ends[0], &first, 1) != 1)
            throw std::runtime_error("the service does not start");
        ::close(ends[0]);
        awaitRest();
    }
    ~IdleService() {
        ::kill(process_, SIGTERM);
        ::waitpid(process_, nullptr, 0);
        std::error_code ignored;
        fs::remove_all(data_, ignored);
    }
    IdleService(IdleService const&) = delete;
    IdleService& operator=(IdleService const&) = delete;

    /// MiB, by the names that the system has for them.
    std::map<std::string, double> memory() const {
        std::map<std::string, double> sizes;
        std::ifstream in(folder() / "smaps_rollup");
        for (std::string line; std::getline(in, line);)
            if (std::size_t const colon = line.find(':'); colon != std::string::npos)
                sizes[line.substr(0, colon)] = std::strtod(line.c_str() + colon + 1, nullptr) / 1024;
        return sizes;
    }

private:
    [[noreturn]] static void become(std::vector<std::string>& words, int output) {
        std::vector<char*> arguments;
        for (std::string& word : words)
            arguments.push_back(word.data());
        arguments.push_back(nullptr);
        ::dup2(output, STDOUT_FILENO);
        ::execv(arguments.front(), arguments.data());
        ::_exit(127);
    }
    fs::path folder() const { return "/proc/" + std::to_string(process_); }
    /// Ticks of the processors until now.
    long long ticks() const {
        std::ifstream in(folder() / "stat");
        std::string word;
        long long ticks = 0;
        for (int field = 1; in >> word; ++field)
            if (field == 14 || field == 15)
                ticks += std::stoll(word);
        return ticks;
    }
    void awaitRest() const {
        for (long long before = -1, now = ticks(); now != before; now = ticks()) {
            before = now;
            std::this_thread::sleep_for(std::chrono::seconds(1));
        }
    }

    fs::path data_ = fs::temp_directory_path() / ("idle_" + std::to_string(::getpid()));
    pid_t process_ = -1;
};

void measure(benchmark::State& state, std::vector<std::string> const& more) {
    for (auto _ : state) {
        IdleService const service(more);
        std::map<std::string, double> memory = service.memory();
        state.counters["resident_mib"] = memory["Rss"];
        state.counters["shared_out_mib"] = memory["Pss"];
        state.counters["own_mib"] = memory["Pss_Anon"];
    }
}

BENCHMARK_CAPTURE(measure, idle, {})->Iterations(1);
BENCHMARK_CAPTURE(measure, watched, {"--metrics", "127.0.0.1:0"})->Iterations(1);

} // namespace

BENCHMARK_MAIN();
