#include "programs/vlmail/mailings/mailing_builder.h"

#include "vlservice/json/json_text.h"

#include <algorithm>
#include <filesystem>
#include <sstream>
#include <utility>

namespace VlMail {
namespace {

/// Letters of one group have the same key; the other way round it is sameAs() that decides.
std::string groupKey(Cfg::ExtractedFields const& fields) {
    std::ostringstream key;
    for (auto const& [priority, field] : fields) {
        if (!field.ignoreOnCompare())
            key << field.name() << '\0' << field.rawValue() << '\0';
    }
    return std::move(key).str();
}

/// Shares nothing with the original: a collected array would otherwise grow in both.
Cfg::ExtractedFields deepCopy(Cfg::ExtractedFields const& fields) {
    return Cfg::ExtractedFields(json::Value(json_deep_copy(fields.serialize().node())).toArray());
}

} // namespace

MailingBuilder::MailingBuilder(PageSaverI& pages, std::string id, Cfg::PackPreset packPreset,
                               long long created)
    : pages_(pages), metadata_{std::move(id), created, std::move(packPreset), {}}, digest_(metadata_.id) {}

std::string MailingBuilder::nameFor(std::string const& document) {
    std::filesystem::path const path(document);
    std::string name = document;
    for (int copy = 2; !documents_.insert(name).second; ++copy)
        name = path.stem().string() + " (" + std::to_string(copy) + ')' + path.extension().string();
    return name;
}

void MailingBuilder::add(std::string const& document, LetterReading letter) {
    for (PageBlob const& blob : letter.blobs) {
        pages_.savePage(document, std::to_string(blob.number), blob.data);
        digest_.add(document, std::to_string(blob.number), blob.data);
    }
    metadata_.entriesDigest = digest_.text();
    pageCount_ += letter.pages.size();
    ++letterCount_;
    Mailing::DocumentPages pages{document, letter.pages};
    if (!metadata_.packPreset.noGroup() && joinGroup(letter, pages))
        return;
    groups_.emplace(groupKey(letter.fields), metadata_.letters.size());
    metadata_.letters.push_back({{std::move(pages)}, std::move(letter.fields)});
}

bool MailingBuilder::joinGroup(LetterReading const& letter, Mailing::DocumentPages const& pages) {
    auto const [begin, end] = groups_.equal_range(groupKey(letter.fields));
    auto const found = std::find_if(begin, end, [&](auto const& entry) {
        return metadata_.letters[entry.second].fields.sameAs(letter.fields);
    });
    if (found == end)
        return false;
    Mailing::MailedLetter& group = metadata_.letters[found->second];
    try {
        Cfg::ExtractedFields combined = deepCopy(group.fields);
        combined.combineOnGroup(letter.fields);
        group.fields = std::move(combined);
    } catch (json::Exc const&) {
        return false;
    }
    group.documents.push_back(pages);
    return true;
}

} // namespace VlMail
