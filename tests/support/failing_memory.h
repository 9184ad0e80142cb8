#pragma once
// Memory that is refused, to the test's own process: see failing_memory.cpp, which replaces operator new.

namespace VLServiceTest {

/// While it lives, the call of operator new with that number, from 1, finds no memory on this thread; with
/// `stays` all later ones neither.
class FailingMemory {
public:
    explicit FailingMemory(long call, bool stays = false);
    ~FailingMemory();
    FailingMemory(FailingMemory const&) = delete;
    FailingMemory& operator=(FailingMemory const&) = delete;

    /// Whether a call has been refused.
    bool hasFailed() const;
};

} // namespace VLServiceTest
