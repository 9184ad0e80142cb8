#pragma once
// A time zone for the duration of a test.

#include <cstdlib>
#include <ctime>
#include <optional>
#include <string>

namespace VLServiceTest {

class TimeZone {
public:
    explicit TimeZone(char const* name) {
        if (char const* const before = std::getenv("TZ"))
            before_ = before;
        setenv("TZ", name, 1);
        tzset();
    }
    ~TimeZone() {
        if (before_)
            setenv("TZ", before_->c_str(), 1);
        else
            unsetenv("TZ");
        tzset();
    }
    TimeZone(TimeZone const&) = delete;
    TimeZone& operator=(TimeZone const&) = delete;

private:
    std::optional<std::string> before_;
};

} // namespace VLServiceTest
