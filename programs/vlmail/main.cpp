#include "programs/vlmail/commands/command.h"

#include "programs/base/commit.h"
#include "programs/base/out_of_memory.h"
#include "programs/base/pending_file.h"
#include "vlservice/platform/log.h"

#include <iostream>
#include <new>
#include <unistd.h>

namespace {

int runOnTerminal(int argc, char** argv) {
    Base::removePendingFilesOnSignals();
    VlMail::Terminal const terminal{std::cout, std::cerr, ::isatty(STDERR_FILENO) == 1};
    Log::setSink([&](LogPriority, std::string const& line) { terminal.note(line); });
    int const status = VlMail::run(argc, argv, terminal, Base::COMMIT);
    Log::setSink({});
    return status;
}

} // namespace

int main(int argc, char** argv) {
    Base::endWhenOutOfMemory(VlMail::OUT_OF_MEMORY);
    try {
        return runOnTerminal(argc, argv);
    } catch (std::bad_alloc const&) {
        Base::endOutOfMemory();
    }
}
