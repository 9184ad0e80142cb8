#pragma once
// Many independent jobs on all cores, each in a process of its own kind: a document that brings its reader
// down takes nothing with it but its own result.

#include <cstddef>
#include <functional>
#include <optional>
#include <string>

namespace VlMail {

/// Makes the result of one job; runs in a worker process and must not throw.
using Job = std::function<std::string(std::size_t index)>;
/// Takes the result of one job; nothing when the worker died over it. Runs in this process.
using Consumer = std::function<void(std::size_t index, std::optional<std::string> result)>;
/// Told how many jobs are done, whichever they are.
using Progress = std::function<void(std::size_t done)>;

/// Runs the jobs 0 to count - 1 on up to `workers` processes and hands their results over in the order of the
/// jobs, each as soon as those before it are there: the output does not depend on the number of workers. The
/// caller must be the only thread of this process. Throws std::system_error when processes cannot be started,
/// and what `consume` throws.
void runJobs(std::size_t count, std::size_t workers, Job const& job, Consumer const& consume,
             Progress const& progress = {});

/// Processors that this process may use, at least 1.
std::size_t processorCount();

} // namespace VlMail
