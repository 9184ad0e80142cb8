#pragma once
// For tests of what must come to an end.

#include <unistd.h>

/// Ends the whole test program, and so fails the test, when the scope lasts longer.
class TimeLimit {
public:
    explicit TimeLimit(unsigned seconds) { alarm(seconds); }
    TimeLimit(TimeLimit const&) = delete;
    TimeLimit& operator=(TimeLimit const&) = delete;
    ~TimeLimit() { alarm(0); }
};
