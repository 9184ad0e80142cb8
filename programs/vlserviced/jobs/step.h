#pragma once
// The steps that mailings and letters go, and how long each takes.

#include <array>
#include <chrono>
#include <functional>

namespace VlServiced {

enum class Step {
    /// Pieces of pages get onto the disk, or what lies there is looked through.
    Storing,
    /// A pack is looked at before it is accepted.
    Admission,
    /// Its container is made.
    Packing,
    /// Its letters are divided among the channels.
    Division,
    /// The container gets into the upload folder under a temporary name.
    Staging,
    /// It gets its own name there.
    Publishing,
    /// Letters are given to a carrier.
    HandingOver,
};

inline constexpr std::array ALL_STEPS{Step::Storing, Step::Admission,  Step::Packing,    Step::Division,
                                      Step::Staging, Step::Publishing, Step::HandingOver};

/// "storing"
char const* stepName(Step step);

/// Told how long a step took, whether it came to its end or failed; called from any thread.
using StepTook = std::function<void(Step, std::chrono::duration<double>)>;

/// Tells how long it was alive.
class StepTime {
public:
    StepTime(StepTook const& took, Step step) : took_(took), step_(step) {}
    ~StepTime() { took_(step_, std::chrono::steady_clock::now() - begin_); }
    StepTime(StepTime const&) = delete;
    StepTime& operator=(StepTime const&) = delete;

private:
    StepTook const& took_;
    Step step_;
    std::chrono::steady_clock::time_point begin_ = std::chrono::steady_clock::now();
};

} // namespace VlServiced
