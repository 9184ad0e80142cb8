#pragma once
// Many independent jobs on all cores, each in a process of its own kind: a document that brings its reader
// down takes nothing with it but its own result.

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <variant>

namespace VlMail {

/// Makes the result of one job; runs in a worker process and must not throw.
using Job = std::function<std::string(std::size_t index)>;

/// Why a job has no result.
enum class JobFailure {
    /// Its worker died over it.
    Died,
    /// Its worker was ended because the job took more than it may.
    OutOfTime,
    OutOfMemory,
    /// The machine had no memory for it.
    NoMemory,
};
using JobResult = std::variant<std::string, JobFailure>;

/// Takes the result of one job. Runs in this process.
using Consumer = std::function<void(std::size_t index, JobResult result)>;
/// Told how many jobs are done, whichever they are.
using Progress = std::function<void(std::size_t done)>;

/// What one job may take of the machine.
struct JobLimits {
    /// Of a processor's time: a job that waits costs nothing.
    std::chrono::milliseconds processor = std::chrono::seconds(30);
    /// In bytes, beyond what its worker has when the job begins.
    std::uint64_t memory = std::uint64_t{1} << 30;
};

struct Workers {
    std::size_t count = 1;
    JobLimits limits = {};
};

/// Runs the jobs 0 to count - 1 on up to so many processes and hands their results over in the order of the
/// jobs, each as soon as those before it are there: the output does not depend on the number of workers. The
/// caller must be the only thread of this process. Throws std::system_error when processes cannot be started,
/// and what `consume` throws.
void runJobs(std::size_t count, Workers const& workers, Job const& job, Consumer const& consume,
             Progress const& progress = {});

/// Processors that this process may use, at least 1.
std::size_t processorCount();

} // namespace VlMail
