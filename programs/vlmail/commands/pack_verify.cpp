// vlmail pack verify: whether every blob of a mailing file is whole, and which page is damaged.
#include "programs/base/error.h"
#include "programs/vlmail/commands/pack.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/pack/container_check.h"

#include <algorithm>
#include <memory>
#include <ostream>
#include <vector>

namespace VlMail {
namespace {

/// More lines help nobody.
constexpr std::size_t MOST_TOLD = 50;

/// Prints what is damaged; false when anything is.
bool verify(std::string const& file, std::ostream& out) {
    ContainerFile container(file);
    ContainerCheck const check = checkContainer(container);
    std::size_t const damages = check.damages.size();
    for (std::size_t i = 0; i < std::min(damages, MOST_TOLD); ++i)
        out << file << ": damaged: " << check.damages[i] << '\n';
    if (damages > MOST_TOLD)
        out << file << ": damaged: and " << damages - MOST_TOLD << " more\n";
    out << file << ": " << counted(check.pages, "page") << " of " << counted(check.documents, "document")
        << ", ";
    if (damages == 0)
        out << "all whole\n";
    else
        out << counted(damages, "blob") << " damaged\n";
    return damages == 0;
}

int verifyAll(std::vector<std::string> const& files, Terminal const& terminal) {
    int status = FINE;
    for (std::string const& file : files) {
        try {
            if (!verify(file, terminal.out))
                status = FAILED;
        } catch (Base::Error const& failure) {
            terminal.complain(failure);
            status = FAILED;
        }
    }
    return status;
}

} // namespace

void addPackVerifyCommand(Base::Command const& pack, Task& task) {
    auto const files = std::make_shared<std::vector<std::string>>();
    Base::Command const command =
        pack.addCommand("verify", "Checks that every page of mailing files is whole and can be expanded");
    command.addOption("FILE", *files, "Mailing files").required();
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return verifyAll(*files, terminal); }; });
}

} // namespace VlMail
