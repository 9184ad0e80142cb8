#pragma once
// A test as a user who has no rights of his own.

#include <cstdlib>
#include <unistd.h>

namespace VLServiceTest {

/// Gives up the rights of root, who may read everything, for a while.
class WithoutRights {
public:
    WithoutRights() : user_(::geteuid()) {
        if (user_ == 0 && ::seteuid(NOBODY) != 0)
            std::abort();
    }
    ~WithoutRights() {
        if (user_ == 0 && ::seteuid(user_) != 0)
            std::abort();
    }
    WithoutRights(WithoutRights const&) = delete;
    WithoutRights& operator=(WithoutRights const&) = delete;

    static constexpr uid_t NOBODY = 65534;

private:
    uid_t user_;
};

} // namespace VLServiceTest
