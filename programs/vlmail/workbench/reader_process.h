#pragma once
// A process that reads documents for the workbench and keeps what it has read: a document that brings it down
// takes nothing with it but its own answer.

#include "programs/vlmail/letters/worker_pool.h"
#include "programs/vlmail/workbench/answer.h"

#include <functional>
#include <memory>
#include <string>

namespace boost::asio {
class io_context;
} // namespace boost::asio

namespace VlMail::Workbench {

/// What is to be done: a name and JSON for it.
struct Job {
    std::string name;
    std::string query;
    /// What the answer is about, for the line that says that there is none.
    std::string subject = {};
    /// A newer job of the name makes this one pointless.
    bool isReplaceable = false;
};

/// Does one job at a time. Everything happens on the thread that runs the io_context, the only one of this
/// process.
class ReaderProcess {
public:
    /// Answers a job; runs in the reading process, where it keeps what it likes, and must not throw.
    using Work = std::function<Answer(std::string const& name, std::string const& query)>;
    using Respond = std::function<void(Answer)>;

    /// `work` is copied into each process that is begun.
    ReaderProcess(boost::asio::io_context& io, JobLimits const& limits, Work work);
    ~ReaderProcess();
    ReaderProcess(ReaderProcess const&) = delete;
    ReaderProcess& operator=(ReaderProcess const&) = delete;

    /// Those that wait come one behind the other, replaceable ones first. One that is replaced is answered at
    /// once, also when it is being done; then it has a second to end.
    void ask(Job job, Respond respond);

private:
    class Impl;
    std::shared_ptr<Impl> impl_;
};

} // namespace VlMail::Workbench
