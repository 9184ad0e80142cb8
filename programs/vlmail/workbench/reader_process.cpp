#include "programs/vlmail/workbench/reader_process.h"

#include "programs/base/quoting.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/process_usage.h"
#include "programs/vlmail/letters/worker_message.h"
#include "programs/vlmail/letters/worker_socket.h"

#include <utility>

#include <boost/asio/buffer.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/write.hpp>

#include <array>
#include <cerrno>
#include <chrono>
#include <climits>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <list>
#include <new>
#include <optional>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>

namespace VlMail::Workbench {
namespace {

namespace asio = boost::asio;
using boost::system::error_code;
using Socket = asio::local::stream_protocol::socket;
using Length = std::uint64_t;

constexpr std::chrono::milliseconds LOOK_EVERY{50};
/// For a job that nobody waits for any more: shorter than beginning anew with a long document takes.
constexpr std::chrono::seconds GRACE{1};
/// The exit status of a process that lacks memory.
constexpr int NO_MEMORY = EXIT_FAILURE;
/// Pictures of a long document that a person scrolls through.
constexpr std::size_t MAX_WAITING = 256;

std::string messageOf(Job const& job) {
    WorkerMessage message;
    message.put(job.name);
    message.put(job.query);
    return message.take();
}

std::string messageOf(Answer const& answer) {
    WorkerMessage message;
    message.put(static_cast<std::uint64_t>(answer.status));
    message.put(answer.type);
    message.put(answer.body);
    return message.take();
}

Answer answerIn(std::string bytes) {
    WorkerMessage message(std::move(bytes));
    Answer answer;
    answer.status = message.smallNumber();
    answer.type = message.text();
    answer.body = message.text();
    return answer;
}

void answerJobs(int socket, ReaderProcess::Work const& work) {
    for (Length length = 0; readAll(socket, &length, sizeof length);) {
        std::string bytes(length, '\0');
        if (!readAll(socket, bytes.data(), bytes.size()))
            return;
        WorkerMessage message(std::move(bytes));
        std::string const name = message.text();
        std::string const answer = messageOf(work(name, message.text()));
        length = answer.size();
        if (!writeAll(socket, &length, sizeof length) || !writeAll(socket, answer.data(), answer.size()))
            return;
    }
}

/// What the other process has open is not this one's: connections of browsers would not end with it.
void closeAllBut(int socket) {
    if (socket > STDERR_FILENO + 1)
        ::close_range(STDERR_FILENO + 1, static_cast<unsigned>(socket) - 1, 0);
    ::close_range(static_cast<unsigned>(socket) + 1, UINT_MAX, 0);
}

[[noreturn]] void live(int socket, ReaderProcess::Work const& work) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    for (int const signal : {SIGINT, SIGTERM, SIGHUP})
        ::signal(signal, SIG_DFL);
    closeAllBut(socket);
    try {
        answerJobs(socket, work);
    } catch (std::bad_alloc const&) {
        ::_exit(NO_MEMORY);
    } catch (...) {
        // The other process sees that this one has ended without an answer.
    }
    // Nothing of the other process is flushed or destroyed here.
    ::_exit(0);
}

/// A process and this end of its socket; it ends with the object.
class Process {
public:
    Process(asio::io_context& io, ReaderProcess::Work const& work) : socket_(io) {
        int ends[2];
        if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0)
            throw std::system_error(errno, std::generic_category(), "cannot connect to a reading process");
        id_ = ::fork();
        if (id_ == 0)
            live(ends[1], work);
        int const failure = errno;
        ::close(ends[1]);
        if (id_ < 0) {
            ::close(ends[0]);
            throw std::system_error(failure, std::generic_category(), "cannot start a reading process");
        }
        socket_.assign(asio::local::stream_protocol(), ends[0]);
    }
    ~Process() {
        kill();
        awaitEnd();
    }
    Process(Process const&) = delete;
    Process& operator=(Process const&) = delete;

    Socket& socket() { return socket_; }
    ProcessUsage usage() const { return usageOf(id_); }
    void kill() const {
        if (id_ > 0)
            ::kill(id_, SIGKILL);
    }

    /// The exit status, or less than nothing for an end by a signal.
    int awaitEnd() {
        int status = 0;
        while (id_ > 0 && ::waitpid(id_, &status, 0) < 0 && errno == EINTR) {
        }
        id_ = -1;
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

private:
    Socket socket_;
    pid_t id_ = -1;
};

Answer superseded() {
    return failureOf(409, Base::Code::Superseded, "something newer was asked for before this was done");
}

} // namespace

class ReaderProcess::Impl : public std::enable_shared_from_this<Impl> {
public:
    Impl(asio::io_context& io, JobLimits const& limits, Work work)
        : io_(io), limits_(limits), work_(std::move(work)), look_(io) {}

    void ask(Job job, Respond respond) {
        if (job.isReplaceable)
            replace(job.name);
        auto const place = job.isReplaceable ? waiting_.begin() : waiting_.end();
        waiting_.insert(place, {std::move(job), std::move(respond)});
        if (waiting_.size() > MAX_WAITING)
            dropOldest();
        startNext();
    }

    void close() {
        isClosed_ = true;
        waiting_.clear();
        running_.reset();
        look_.cancel();
        process_.reset();
    }

private:
    using Clock = std::chrono::steady_clock;

    struct Asked {
        Job job;
        Respond respond;
    };
    struct Running {
        Asked asked;
        ProcessUsage begin;
        JobFailure failure = JobFailure::Died;
        /// Nobody waits for it, and it has until then.
        std::optional<Clock::time_point> due = {};
    };

    void replace(std::string const& name) {
        for (auto at = waiting_.begin(); at != waiting_.end();)
            if (at->job.name == name) {
                Respond const respond = std::move(at->respond);
                at = waiting_.erase(at);
                respond(superseded());
            } else {
                ++at;
            }
        if (running_ && !running_->due && running_->asked.job.name == name) {
            running_->due = Clock::now() + GRACE;
            std::exchange(running_->asked.respond, [](Answer const&) {})(superseded());
        }
    }

    void dropOldest() {
        Asked const oldest = std::move(waiting_.front());
        waiting_.pop_front();
        oldest.respond(superseded());
    }

    void startNext() {
        if (running_ || waiting_.empty() || isClosed_)
            return;
        running_.emplace(Running{std::move(waiting_.front()), {}});
        waiting_.pop_front();
        try {
            if (!process_)
                process_ = std::make_shared<Process>(io_, work_);
        } catch (std::exception const& failure) {
            return finish(failureOf(failure));
        }
        running_->begin = process_->usage();
        send();
        lookAgain();
    }

    void send() {
        message_ = messageOf(running_->asked.job);
        length_ = message_.size();
        std::array<asio::const_buffer, 2> const buffers{asio::buffer(&length_, sizeof length_),
                                                        asio::buffer(message_)};
        asio::async_write(process_->socket(), buffers,
                          [self = shared_from_this(), process = process_](error_code const& ec, std::size_t) {
                              if (process == self->process_)
                                  ec ? self->died() : self->readLength();
                          });
    }

    void readLength() {
        asio::async_read(process_->socket(), asio::buffer(&length_, sizeof length_),
                         [self = shared_from_this(), process = process_](error_code const& ec, std::size_t) {
                             if (process == self->process_)
                                 ec ? self->died() : self->readMessage();
                         });
    }

    void readMessage() {
        message_.assign(length_, '\0');
        asio::async_read(process_->socket(), asio::buffer(message_),
                         [self = shared_from_this(), process = process_](error_code const& ec, std::size_t) {
                             if (process == self->process_)
                                 ec ? self->died() : self->finish(answerIn(std::move(self->message_)));
                         });
    }

    void finish(Answer answer) {
        Running const done = std::move(*running_);
        running_.reset();
        look_.cancel();
        done.asked.respond(std::move(answer));
        startNext();
    }

    void died() {
        process_->kill();
        JobFailure const failure =
            process_->awaitEnd() == NO_MEMORY ? JobFailure::NoMemory : running_->failure;
        process_.reset();
        finish(failureOf(422, Base::Code::LimitExceeded,
                         "cannot read " + Base::inQuotes(running_->asked.job.subject) + ": " +
                             inWords(failure, limits_)));
    }

    void lookAgain() {
        look_.expires_after(LOOK_EVERY);
        look_.async_wait([self = shared_from_this()](error_code const& ec) {
            if (!ec && self->running_ && self->process_)
                self->hold();
        });
    }

    /// Ends the process when its job takes more than it may.
    void hold() {
        ProcessUsage const usage = process_->usage();
        if (usage.processor > running_->begin.processor + limits_.processor)
            end(JobFailure::OutOfTime);
        else if (usage.memory > running_->begin.memory + limits_.memory)
            end(JobFailure::OutOfMemory);
        else if (running_->due && Clock::now() > *running_->due)
            end(JobFailure::Died);
        lookAgain();
    }

    void end(JobFailure failure) {
        running_->failure = failure;
        process_->kill();
    }

    asio::io_context& io_;
    JobLimits const limits_;
    Work const work_;
    asio::steady_timer look_;
    std::shared_ptr<Process> process_;
    std::list<Asked> waiting_;
    std::optional<Running> running_;
    Length length_ = 0;
    std::string message_;
    bool isClosed_ = false;
};

ReaderProcess::ReaderProcess(asio::io_context& io, JobLimits const& limits, Work work)
    : impl_(std::make_shared<Impl>(io, limits, std::move(work))) {}
ReaderProcess::~ReaderProcess() { impl_->close(); }

void ReaderProcess::ask(Job job, Respond respond) { impl_->ask(std::move(job), std::move(respond)); }

} // namespace VlMail::Workbench
