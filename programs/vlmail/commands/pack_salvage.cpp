// vlmail pack salvage: a new mailing file out of what is whole in a damaged one.
#include "programs/base/error.h"
#include "programs/base/log_capture.h"
#include "programs/base/plain_text.h"
#include "programs/mailing/container_writer.h"
#include "programs/mailing/entries_digest.h"
#include "programs/mailing/metadata.h"
#include "programs/vlmail/commands/pack.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/pack/container_file.h"
#include "programs/vlmail/pack/salvage_plan.h"
#include "programs/vlmail/terminal/text_table.h"

#include <charconv>
#include <ctime>
#include <filesystem>
#include <map>
#include <memory>
#include <ostream>
#include <set>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

struct Options {
    std::string file;
    std::string target;
};

void requireOtherFile(Options const& options) {
    std::error_code ignored;
    if (fs::equivalent(options.file, options.target, ignored))
        throw Base::Error(Base::Code::FileExists,
                          "\"" + options.target +
                              "\" is the damaged file itself, which is never written to; name " +
                              "another with -o");
    if (fs::exists(fs::symlink_status(options.target, ignored)))
        throw Base::Error(Base::Code::FileExists,
                          "\"" + options.target + "\" is there already; name another with -o");
}

/// What stands in for metadata that is lost: a mailing of no letters.
SharedMemBuffer emptyMetadata(std::string const& packId) {
    return Mailing::Metadata{packId, std::time(nullptr), {}, {}}.toBlob();
}

void write(ByteFile& file, SalvagePlan const& plan, fs::path const& target) {
    Base::LogCapture const quiet;
    Mailing::ContainerWriter out(target, plan.packId);
    Mailing::EntriesDigest digest(plan.packId);
    for (SavedPage const& page : plan.pages) {
        SharedMemBuffer const blob = salvagedBlob(file, page.blob);
        digest.add(page.name.document, page.name.page, blob);
        out.savePage(page.name.document, page.name.page, blob);
    }
    SharedMemBuffer const metadata =
        plan.metadata ? salvagedBlob(file, *plan.metadata) : emptyMetadata(plan.packId);
    out.finish(Mailing::withEntriesDigest(metadata, digest.text()), "make room on the disk and try again");
}

/// "pages 1-3, 5"; names that are no numbers one by one.
std::string inWords(std::vector<std::string> const& names) {
    std::vector<int> numbers;
    std::string listed;
    for (std::string const& name : names) {
        int number = 0;
        auto const [end, failure] = std::from_chars(name.data(), name.data() + name.size(), number);
        if (failure == std::errc() && end == name.data() + name.size())
            numbers.push_back(number);
        listed += (listed.empty() ? "" : ", ") + name;
    }
    return numbers.size() == names.size() ? pagesInWords(numbers) : listed;
}

char const* inWords(NamedBy namedBy) {
    switch (namedBy) {
    case NamedBy::Index:
        return "the index";
    case NamedBy::Metadata:
        return "the metadata";
    case NamedBy::Nothing:
        break;
    }
    return "nothing: numbered in file order";
}

void printPages(SalvagePlan const& plan, std::ostream& out) {
    std::map<std::pair<std::string, NamedBy>, std::vector<std::string>> documents;
    for (SavedPage const& page : plan.pages)
        documents[{page.name.document, page.namedBy}].push_back(page.name.page);
    TextTable table({{"document"}, {"saved"}, {"named by"}});
    for (auto const& [document, pages] : documents)
        table.addRow({document.first, inWords(pages), inWords(document.second)});
    if (!table.empty())
        table.print(out);
}

std::size_t documentCount(SalvagePlan const& plan) {
    std::set<std::string> documents;
    for (SavedPage const& page : plan.pages)
        documents.insert(page.name.document);
    return documents.size();
}

void report(SalvagePlan const& plan, std::string const& target, std::ostream& out) {
    printPages(plan, out);
    for (LostPage const& page : plan.lost)
        out << "lost: page " << Base::plainLine(page.name.page) << " of \""
            << Base::plainLine(page.name.document)
            << "\": " << (page.isDamaged ? "its data is damaged" : "it was not found") << '\n';
    for (std::uint64_t const position : plan.damagedAt)
        out << "lost: damaged data at byte " << position << ", of a page without a name\n";
    if (!plan.metadata)
        out << "lost: the metadata: which pages belong to which letter is not known any more\n";
    out << counted(plan.pages.size(), "page") << " of " << counted(documentCount(plan), "document")
        << (plan.metadata ? " and the metadata" : "") << " saved into " << target << '\n';
}

int salvage(Options const& options, Terminal const& terminal) {
    ByteFile file(options.file);
    requireOtherFile(options);
    SalvagePlan const plan = planSalvage(file);
    if (plan.pages.empty() && !plan.metadata)
        throw Base::Error(Base::Code::MailingDamaged,
                          "nothing in \"" + options.file + "\" can be saved: it holds no page that is whole");
    write(file, plan, options.target);
    report(plan, options.target, terminal.out);
    return plan.isComplete() ? FINE : INCOMPLETE;
}

} // namespace

void addPackSalvageCommand(Base::Command const& pack, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = pack.addCommand(
        "salvage",
        "Saves what is whole in a damaged mailing file into a new one; exit status 2 when not all was");
    command.addOption("FILE", options->file, "A damaged mailing file; it is only read").required();
    command.addOption("-o,--output", options->target, "The new mailing file").required();
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return salvage(*options, terminal); }; });
}

} // namespace VlMail
