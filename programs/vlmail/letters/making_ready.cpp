#include "programs/vlmail/letters/making_ready.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/base/read_file.h"
#include "programs/base/utf8.h"
#include "programs/mailing/page_blob.h"
#include "programs/mailing/print_wishes.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/letters/worker_message.h"

#include <algorithm>
#include <set>
#include <system_error>
#include <utility>
#include <variant>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

using Production::Part;
using Production::PreparedDocument;
using Production::PreparedPage;

std::string pack(PreparedDocument const& document) {
    WorkerMessage message;
    message.put(document.error);
    message.put(document.sha256);
    message.put(document.pages.size());
    for (PreparedPage const& page : document.pages) {
        message.put(page.pdf);
        message.put(static_cast<std::uint64_t>(page.size.width));
        message.put(static_cast<std::uint64_t>(page.size.height));
        message.put(std::uint64_t{page.isColoured});
    }
    message.put(document.redrawnPages.size());
    for (int const number : document.redrawnPages)
        message.put(static_cast<std::uint64_t>(number));
    return message.take();
}

PreparedDocument unpack(std::string bytes) {
    WorkerMessage message(std::move(bytes));
    PreparedDocument document{message.text(), message.text()};
    document.pages.resize(message.number());
    for (PreparedPage& page : document.pages) {
        page.pdf = message.text();
        page.size.width = message.smallNumber();
        page.size.height = message.smallNumber();
        page.isColoured = message.number() != 0;
    }
    document.redrawnPages.resize(message.number());
    for (int& number : document.redrawnPages)
        number = message.smallNumber();
    return document;
}

PreparedDocument unusable(char const* code, fs::path const& file, std::string const& why) {
    return {code + Base::validUtf8(file.string()) + ": " + why};
}

PreparedDocument prepared(FoundDocument const& found) {
    fs::path const& file = found.file;
    if (found.isOfService())
        return Production::prepare(*found.bytes, file);
    std::error_code failure;
    if (std::uintmax_t const size = fs::file_size(file, failure);
        !failure && size > Production::MAX_DOCUMENT_BYTES)
        return {Production::whyTooLarge(file)};
    try {
        return Production::prepare(Base::readFile(file), file);
    } catch (Base::Error const& gone) {
        return {Production::DOCUMENT_UNKNOWN + Base::validUtf8(gone.what())};
    }
}

std::set<std::string> idsIn(std::vector<Cfg::PackPreset> const& presets) {
    std::set<std::string> ids;
    for (Cfg::PackPreset const& preset : presets) {
        for (Cfg::LetterheadInf const& letterhead : preset.letterheads())
            ids.insert(letterhead.id);
        for (Cfg::PackPreset::Attachment const& attachment : preset.attachments())
            ids.insert(attachment.id);
    }
    return ids;
}

std::vector<Production::PageSize> sizesOf(std::vector<PreparedPage> const& pages) {
    std::vector<Production::PageSize> sizes;
    for (PreparedPage const& page : pages)
        sizes.push_back(page.size);
    return sizes;
}

std::vector<PageBlob> madePages(std::vector<PreparedPage> const& pages, Part const& part,
                                Production::Maker& maker) {
    std::vector<PageBlob> blobs;
    for (PreparedPage const& page : pages) {
        int const number = static_cast<int>(blobs.size()) + 1;
        PreparedPage const made = maker.make(page, part, number);
        blobs.push_back({number, Mailing::compressed(made.pdf), {}, made.size, made.isColoured});
    }
    return blobs;
}

/// An attachment that is to be made, and what has become of it.
struct AttachmentJob {
    Part part;
    PreparedDocument const& document;
    Production::Maker& maker;
    std::string& error;
    MadeAttachment& made;
};

std::string madeIn(AttachmentJob const& job) {
    WorkerMessage message;
    std::string const name = "the attachment " + Base::inQuotes(job.part.id);
    std::string error = !job.document.error.empty()
                            ? job.document.error
                            : job.maker.whyNot(job.part, sizesOf(job.document.pages), name);
    std::vector<PageBlob> pages;
    try {
        if (error.empty())
            pages = madePages(job.document.pages, job.part, job.maker);
    } catch (Base::Error const& failure) {
        error = Production::DOCUMENT_DAMAGED + name + ", " + Base::validUtf8(failure.what());
    }
    message.put(error);
    put(message, pages);
    return message.take();
}

/// The first failure of a pack preset is told.
void take(AttachmentJob const& job, JobResult result, JobLimits const& limits) {
    std::string error;
    if (auto const* const failure = std::get_if<JobFailure>(&result)) {
        error = Production::DOCUMENT_DAMAGED + std::string("the attachment ") + Base::inQuotes(job.part.id) +
                ": " + inWords(*failure, limits);
    } else {
        WorkerMessage message(std::get<std::string>(std::move(result)));
        error = message.text();
        job.made.pages = takeBlobs(message);
    }
    if (job.error.empty())
        job.error = error;
}

bool namesDocuments(Cfg::PackPreset const& preset) {
    return !preset.letterheads().empty() || !preset.attachments().empty();
}

/// The pack presets by which documents of these names are sent, each once, those that cannot be told left
/// out; attachments of the batch are added to `folder`.
std::vector<Cfg::PackPreset> packPresetsOf(std::vector<std::string> const& files, Cfg::Presets const& presets,
                                           DocumentFolder& folder) {
    auto const& all = presets.elements<Cfg::PresetFieldIdxs::PackPresets>();
    if (std::none_of(all.begin(), all.end(), [](auto const& one) { return namesDocuments(one.value); }))
        return {};
    std::map<std::string, Cfg::PackPreset> used;
    PresetIndex const index(presets);
    for (std::string const& file : files) {
        try {
            auto const& [extractPreset, packPreset] = index.findMatch(fs::path(file).filename().string());
            if (extractPreset.isForAttachemnt())
                folder.add(file);
            else if (namesDocuments(packPreset))
                used.emplace(packPreset.name(), packPreset);
        } catch (std::exception const&) {
            // Its reader says what is wrong.
        }
    }
    std::vector<Cfg::PackPreset> list;
    for (auto& [name, preset] : used)
        list.push_back(std::move(preset));
    return list;
}

} // namespace

void MakingReady::prepare(std::vector<Cfg::PackPreset> const& presets, DocumentFolder const& folder,
                          Workers const& workers) {
    takeDocuments(presets, folder, workers);
    makeAttachments(presets, workers);
}

void MakingReady::prepareFor(std::vector<std::string> const& files, Cfg::Presets const& presets,
                             DocumentFolder folder, Workers const& workers) {
    std::vector<Cfg::PackPreset> const used = packPresetsOf(files, presets, folder);
    prepare(used, folder, workers);
}

std::vector<PreparedDocument> prepareDocuments(std::vector<FoundDocument> const& found,
                                               Workers const& workers) {
    std::vector<PreparedDocument> documents;
    runJobs(
        found.size(), workers, [&](std::size_t index) { return pack(prepared(found[index])); },
        [&](std::size_t index, JobResult result) {
            auto const* const failure = std::get_if<JobFailure>(&result);
            documents.push_back(failure ? unusable(Production::DOCUMENT_DAMAGED, found[index].file,
                                                   inWords(*failure, workers.limits))
                                        : unpack(std::get<std::string>(std::move(result))));
        });
    return documents;
}

void MakingReady::takeDocuments(std::vector<Cfg::PackPreset> const& presets, DocumentFolder const& folder,
                                Workers const& workers) {
    std::vector<std::string> ids;
    std::vector<FoundDocument> found;
    for (std::string const& id : idsIn(presets)) {
        try {
            found.push_back(folder.find(id));
            ids.push_back(id);
        } catch (Base::Error const& unknown) {
            documents_[id].error = unknown.what();
        }
    }
    std::vector<PreparedDocument> documents = prepareDocuments(found, workers);
    for (std::size_t i = 0; i < ids.size(); ++i) {
        used_[ids[i]] = {ids[i], found[i].file, documents[i].sha256, found[i].isOfService()};
        documents_[ids[i]] = std::move(documents[i]);
    }
}

void MakingReady::makeAttachments(std::vector<Cfg::PackPreset> const& presets, Workers const& workers) {
    std::vector<AttachmentJob> jobs;
    for (Cfg::PackPreset const& preset : presets) {
        Attachments& attachments = attachments_[preset.name()];
        attachments.made.resize(preset.attachments().size());
        for (std::size_t i = 0; i < preset.attachments().size(); ++i) {
            std::string const& id = preset.attachments()[i].id;
            attachments.made[i].id = id;
            attachments.made[i].document = used_.contains(id) ? used_.at(id).file.filename().string() : id;
            PreparedDocument const& document = documents_.at(id);
            Production::Maker& maker = makerFor(preset);
            jobs.push_back(
                {{Part::Kind::Attachment, id}, document, maker, attachments.error, attachments.made[i]});
        }
    }
    runJobs(
        jobs.size(), workers, [&](std::size_t index) { return madeIn(jobs[index]); },
        [&](std::size_t index, JobResult result) { take(jobs[index], std::move(result), workers.limits); });
}

std::string MakingReady::whyNot(Cfg::PackPreset const& preset,
                                std::vector<Production::PageSize> const& pages) {
    auto const attachments = attachments_.find(preset.name());
    if (attachments != attachments_.end() && !attachments->second.error.empty())
        return attachments->second.error;
    return makerFor(preset).whyNot({Part::Kind::FirstLetter}, pages, "the letter");
}

std::vector<Production::Finding> MakingReady::warningsFor(Cfg::PackPreset const& preset) const {
    std::vector<Production::Finding> warnings;
    for (std::string const& id : idsIn({preset})) {
        auto const document = documents_.find(id);
        if (document != documents_.end() && !document->second.redrawnPages.empty())
            warnings.push_back(Production::redrawnFinding({}, pagesInWords(document->second.redrawnPages) +
                                                                  " of " + Base::inQuotes(id) + ": "));
    }
    return warnings;
}

Production::Maker& MakingReady::makerFor(Cfg::PackPreset const& preset) {
    std::unique_ptr<Production::Maker>& maker = makers_[preset.name()];
    if (!maker)
        maker = std::make_unique<Production::Maker>(preset, documents_);
    return *maker;
}

bool MakingReady::countsColours(Cfg::PackPreset const& preset) const {
    return colours_ == Colours::Counted && preset.colorModel() != Mailing::GREY;
}

std::vector<MadeAttachment> const& MakingReady::attachmentsOf(std::string const& packPreset) const {
    static std::vector<MadeAttachment> const none;
    auto const found = attachments_.find(packPreset);
    return found == attachments_.end() ? none : found->second.made;
}

bool MakingReady::isWhole() const {
    return std::ranges::all_of(documents_, [](auto const& one) { return one.second.error.empty(); });
}

std::vector<UsedDocument> MakingReady::usedDocuments() const {
    std::vector<UsedDocument> used;
    for (auto const& [id, document] : documents_)
        if (document.error.empty())
            used.push_back(used_.at(id));
    return used;
}

std::vector<UsedDocument> MakingReady::usedDocumentsOf(Cfg::PackPreset const& preset) const {
    std::set<std::string> const ids = idsIn({preset});
    std::vector<UsedDocument> used = usedDocuments();
    std::erase_if(used, [&](UsedDocument const& document) { return !ids.contains(document.id); });
    return used;
}

} // namespace VlMail
