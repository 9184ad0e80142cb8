#include "programs/vlmail/letters/worker_pool.h"

#include "programs/vlmail/letters/process_usage.h"
#include "programs/vlmail/letters/worker_socket.h"

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <map>
#include <memory>
#include <new>
#include <optional>
#include <poll.h>
#include <sched.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>
#include <utility>
#include <vector>

namespace VlMail {
namespace {

// What goes over a worker's socket: the job's number one way, the result's length and bytes the other.
using Number = std::uint64_t;

class Worker {
public:
    /// `others` are closed in the new process, so that their workers see this process end.
    Worker(Job const& job, std::vector<std::unique_ptr<Worker>> const& others) {
        int ends[2];
        if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0)
            fail("cannot connect to a worker process");
        process_ = ::fork();
        if (process_ < 0) {
            ::close(ends[0]);
            ::close(ends[1]);
            fail("cannot start a worker process");
        }
        if (process_ == 0) {
            ::close(ends[0]);
            for (auto const& other : others)
                if (other)
                    ::close(other->socket_);
            serve(ends[1], job);
        }
        ::close(ends[1]);
        socket_ = ends[0];
    }
    ~Worker() {
        ::close(socket_);
        // It may be in the middle of a job that nobody waits for.
        if (process_ > 0)
            ::kill(process_, SIGKILL);
        awaitEnd();
    }
    Worker(Worker const&) = delete;
    Worker& operator=(Worker const&) = delete;

    int socket() const { return socket_; }
    std::optional<std::size_t> job() const { return job_; }

    void start(std::size_t index) {
        job_ = index;
        begin_ = usageOf(process_);
        failure_ = JobFailure::Died;
        Number const number = index;
        // A worker that is gone, or cannot be reached, is noticed when its result is read.
        if (!writeAll(socket_, &number, sizeof number))
            ::shutdown(socket_, SHUT_RDWR);
    }

    /// Ends the worker when its job takes more than it may.
    void hold(JobLimits const& limits) {
        ProcessUsage const usage = usageOf(process_);
        if (usage.processor > begin_.processor + limits.processor)
            end(JobFailure::OutOfTime);
        else if (usage.memory > begin_.memory + limits.memory)
            end(JobFailure::OutOfMemory);
    }

    /// The result of the job that was started. Without one the worker is dead.
    JobResult finish() {
        job_.reset();
        Number length = 0;
        if (!readAll(socket_, &length, sizeof length))
            return whyNot();
        std::string result(length, '\0');
        if (!readAll(socket_, result.data(), result.size()))
            return whyNot();
        return result;
    }

private:
    [[noreturn]] static void fail(char const* what) {
        throw std::system_error(errno, std::generic_category(), what);
    }

    void end(JobFailure failure) {
        failure_ = failure;
        ::kill(process_, SIGKILL);
    }

    /// The exit status, or less than nothing for an end by a signal.
    int awaitEnd() {
        int status = 0;
        while (process_ > 0 && ::waitpid(process_, &status, 0) < 0 && errno == EINTR) {
        }
        process_ = -1;
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

    JobFailure whyNot() {
        // It ends when nobody listens to it.
        ::shutdown(socket_, SHUT_RDWR);
        return awaitEnd() == NO_MEMORY ? JobFailure::NoMemory : failure_;
    }

    /// The life of the worker process. Whatever is thrown ends it, too: behind the constructor it would go on
    /// as a second parent.
    [[noreturn]] static void serve(int socket, Job const& job) {
        try {
            answer(socket, job);
        } catch (std::bad_alloc const&) {
            ::_exit(NO_MEMORY);
        } catch (...) {
            // The parent sees that this process has ended without a result.
        }
        // Nothing of the parent's is flushed or destroyed here.
        ::_exit(0);
    }

    /// The exit status of a worker that lacks memory, however it comes to its end.
    static constexpr int NO_MEMORY = EXIT_FAILURE;

    /// Ends when the other side closes.
    static void answer(int socket, Job const& job) {
        for (Number index = 0; readAll(socket, &index, sizeof index);) {
            std::string const result = job(index);
            Number const length = result.size();
            if (!writeAll(socket, &length, sizeof length) || !writeAll(socket, result.data(), result.size()))
                break;
        }
    }

    pid_t process_ = -1;
    int socket_ = -1;
    std::optional<std::size_t> job_;
    /// What the process had used when the job began.
    ProcessUsage begin_;
    /// Why there is no result, if there is none.
    JobFailure failure_ = JobFailure::Died;
};

class Pool {
    /// Often enough that no job gets far beyond its limits meanwhile.
    static constexpr int LOOK_EVERY_MS = 50;

public:
    Pool(std::size_t count, Workers const& workers, Job const& job, Consumer const& consume,
         Progress const& progress)
        : count_(count), job_(job), consume_(consume), progress_(progress), limits_(workers.limits),
          workers_(std::max<std::size_t>(1, std::min(workers.count, count))) {}

    void run() {
        for (auto& worker : workers_) {
            worker = std::make_unique<Worker>(job_, workers_);
            startNext(*worker);
        }
        while (consumed_ < count_) {
            std::unique_ptr<Worker>& worker = waitForResult();
            take(worker);
        }
    }

private:
    void startNext(Worker& worker) {
        if (started_ < count_)
            worker.start(started_++);
    }

    std::unique_ptr<Worker>& waitForResult() {
        std::vector<pollfd> polled;
        for (auto const& worker : workers_)
            polled.push_back({worker->job() ? worker->socket() : -1, POLLIN, 0});
        int heard = 0;
        while (heard == 0) {
            heard = wait(polled);
            holdToLimits();
        }
        std::size_t ready = 0;
        while (polled[ready].revents == 0)
            ++ready;
        return workers_[ready];
    }

    /// How many workers are heard of before their use of the machine is to be looked at again.
    static int wait(std::vector<pollfd>& polled) {
        int const heard = ::poll(polled.data(), polled.size(), LOOK_EVERY_MS);
        if (heard < 0 && errno != EINTR)
            throw std::system_error(errno, std::generic_category(), "cannot wait for worker processes");
        return std::max(heard, 0);
    }

    void holdToLimits() {
        auto const now = std::chrono::steady_clock::now();
        if (now < nextLook_)
            return;
        nextLook_ = now + std::chrono::milliseconds(LOOK_EVERY_MS);
        for (auto const& worker : workers_)
            if (worker->job())
                worker->hold(limits_);
    }

    void take(std::unique_ptr<Worker>& worker) {
        std::size_t const index = *worker->job();
        JobResult result = worker->finish();
        if (std::holds_alternative<JobFailure>(result)) {
            worker.reset();
            worker = std::make_unique<Worker>(job_, workers_);
        }
        startNext(*worker);
        results_.emplace(index, std::move(result));
        if (progress_)
            progress_(++done_);
        for (auto next = results_.find(consumed_); next != results_.end(); next = results_.find(consumed_)) {
            consume_(consumed_, std::move(next->second));
            results_.erase(next);
            ++consumed_;
        }
    }

    std::size_t count_;
    Job const& job_;
    Consumer const& consume_;
    Progress const& progress_;
    JobLimits const limits_;
    std::chrono::steady_clock::time_point nextLook_;
    std::vector<std::unique_ptr<Worker>> workers_;
    std::map<std::size_t, JobResult> results_;
    std::size_t started_ = 0;
    std::size_t done_ = 0;
    std::size_t consumed_ = 0;
};

} // namespace

void runJobs(std::size_t count, Workers const& workers, Job const& job, Consumer const& consume,
             Progress const& progress) {
    if (count == 0)
        return;
    Pool(count, workers, job, consume, progress).run();
}

std::size_t processorCount() {
    cpu_set_t set;
    return ::sched_getaffinity(0, sizeof set, &set) == 0 ? static_cast<std::size_t>(CPU_COUNT(&set)) : 1;
}

} // namespace VlMail
