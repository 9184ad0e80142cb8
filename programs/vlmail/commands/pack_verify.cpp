// vlmail pack verify: whether every blob of a mailing file is whole, and which page is damaged.
#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/vlmail/commands/pack.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/pack/container_file.h"

#include <memory>
#include <ostream>
#include <set>
#include <vector>

namespace VlMail {
namespace {

/// Prints what is damaged; false when anything is.
bool verify(std::string const& file, std::ostream& out) {
    ContainerFile container(file);
    std::set<std::string> documents;
    std::size_t pages = 0, damaged = 0;
    for (unsigned long long i = 0; i < container.size(); ++i) {
        ContainerFile::Entry const& entry = container.entry(i);
        if (isPage(entry)) {
            ++pages;
            documents.insert(entry.document);
        }
        std::string const damage = container.blob(i).damage;
        if (damage.empty())
            continue;
        ++damaged;
        out << file << ": damaged: " << Base::plainLine(inWords(entry)) << ": " << damage << '\n';
    }
    bool const hasMetadata = container.size() > pages;
    if (!hasMetadata)
        out << file << ": damaged: the metadata: it is missing\n";
    out << file << ": " << counted(pages, "page") << " of " << counted(documents.size(), "document") << ", ";
    if (damaged == 0 && hasMetadata)
        out << "all whole\n";
    else
        out << counted(damaged + (hasMetadata ? 0 : 1), "blob") << " damaged\n";
    return damaged == 0 && hasMetadata;
}

int verifyAll(std::vector<std::string> const& files, Terminal const& terminal) {
    int status = FINE;
    for (std::string const& file : files) {
        try {
            if (!verify(file, terminal.out))
                status = FAILED;
        } catch (Base::Error const& failure) {
            terminal.complain(failure.what());
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
