#include "programs/mailing/metadata.h"

#include "programs/mailing/page_blob.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <array>
#include <sstream>
#include <stdexcept>
#include <utility>

namespace Mailing {
namespace {

constexpr char const* ID_KEY = "id";
constexpr char const* CREATED_KEY = "created";
constexpr char const* LETTERS_KEY = "letters";
constexpr char const* DOCUMENTS_KEY = "documents";
constexpr char const* NAME_KEY = "name";
constexpr char const* PAGES_KEY = "pages";
constexpr char const* FIELDS_KEY = "fields";
constexpr char const* ROLE_KEY = "role";
constexpr char const* SHEETS_KEY = "sheets";
constexpr char const* COLOURED_PAGES_KEY = "coloured_pages";
constexpr char const* MADE_READY_KEY = "made_ready";
constexpr char const* USED_DOCUMENTS_KEY = "used_documents";
constexpr char const* SHA256_KEY = "sha256";
constexpr char const* ENTRIES_DIGEST_KEY = "entries_digest";

/// What is not the pack preset's in the object that it shares; its name's key is listed so that the name is
/// not taken for an unknown key as well.
std::unordered_set<std::string> const NOT_THE_PRESETS{ID_KEY,
                                                      CREATED_KEY,
                                                      LETTERS_KEY,
                                                      MADE_READY_KEY,
                                                      USED_DOCUMENTS_KEY,
                                                      ENTRIES_DIGEST_KEY,
                                                      PURCHASE_ORDER_KEY,
                                                      "pack_preset"};

using Role = DocumentPages::Role;

constexpr std::array ROLES{
    std::pair{Role::Letter, "letter"},
    std::pair{Role::Attachment, "attachment"},
    std::pair{Role::Blank, "blank"},
};

char const* nameOf(Role role) {
    return std::find_if(ROLES.begin(), ROLES.end(), [&](auto const& one) { return one.first == role; })
        ->second;
}

/// Older metadata has no roles: all its pages are those of letters.
Role roleIn(json::Object const& object) {
    std::string const name = object.get(ROLE_KEY).textOrEmpty();
    auto const found =
        std::find_if(ROLES.begin(), ROLES.end(), [&](auto const& one) { return one.second == name; });
    return found == ROLES.end() ? Role::Letter : found->first;
}

json::Object toJson(DocumentPages const& document) {
    json::Array pages;
    for (int const page : document.pages)
        pages.append(page);
    return {{NAME_KEY, document.document}, {PAGES_KEY, pages}, {ROLE_KEY, nameOf(document.role)}};
}

DocumentPages documentFrom(json::Object const& object) {
    DocumentPages document{object.get(NAME_KEY).toString(), {}, roleIn(object)};
    for (json::Value const& page : object.get(PAGES_KEY).toArray())
        document.pages.push_back(static_cast<int>(page.toInt()));
    return document;
}

json::Object toJson(MailedLetter const& letter) {
    json::Array documents;
    for (DocumentPages const& document : letter.documents)
        documents.append(toJson(document));
    return {{DOCUMENTS_KEY, documents}, {FIELDS_KEY, letter.fields.serialize()}};
}

json::Object madeReadyToJson(MailedLetter const& letter) {
    json::Object object = toJson(letter);
    object.set(SHEETS_KEY, letter.sheets);
    object.set(COLOURED_PAGES_KEY, letter.colouredPages);
    return object;
}

json::Array toJson(std::vector<UsedDocument> const& documents) {
    json::Array array;
    for (UsedDocument const& document : documents)
        array.append(json::Object{{ID_KEY, document.id}, {SHA256_KEY, document.sha256}});
    return array;
}

std::vector<UsedDocument> usedDocumentsIn(json::Value const& array) {
    std::vector<UsedDocument> documents;
    if (array)
        for (json::Value const& document : array.toArray())
            documents.push_back(
                {document.toObject().get(ID_KEY).toString(), document.toObject().get(SHA256_KEY).toString()});
    return documents;
}

SharedMemBuffer blobOf(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return compressed(text.str());
}

json::Object objectIn(SharedMemBuffer blob) {
    SharedMemBuffer const text = expanded(std::move(blob));
    std::string_view const json = viewOf(text);
    return json::strToObject(json.data(), json.size());
}

} // namespace

json::Object Metadata::toJson() const {
    json::Object object = packPreset.serialize(true);
    object.set(ID_KEY, id);
    object.set(CREATED_KEY, created);
    json::Array all;
    for (MailedLetter const& letter : letters)
        all.append(madeReady ? madeReadyToJson(letter) : Mailing::toJson(letter));
    object.set(LETTERS_KEY, all);
    if (madeReady)
        object.set(MADE_READY_KEY, true);
    if (!usedDocuments.empty())
        object.set(USED_DOCUMENTS_KEY, Mailing::toJson(usedDocuments));
    if (!entriesDigest.empty())
        object.set(ENTRIES_DIGEST_KEY, entriesDigest);
    if (!purchaseOrder.empty())
        object.set(PURCHASE_ORDER_KEY, purchaseOrder);
    return object;
}

Metadata Metadata::fromJson(json::Object const& object) {
    Metadata metadata{
        object.get(ID_KEY).toString(), object.get(CREATED_KEY).toInt(), packPresetIn(object), {}};
    for (json::Value const& letter : object.get(LETTERS_KEY).toArray())
        metadata.letters.push_back(letterIn(letter.toObject()));
    metadata.madeReady = object.get(MADE_READY_KEY).isTrue();
    metadata.usedDocuments = usedDocumentsIn(object.get(USED_DOCUMENTS_KEY));
    metadata.entriesDigest = object.get(ENTRIES_DIGEST_KEY).textOrEmpty();
    metadata.purchaseOrder = object.get(PURCHASE_ORDER_KEY).textOrEmpty();
    return metadata;
}

SharedMemBuffer Metadata::toBlob() const { return blobOf(toJson()); }

Metadata Metadata::fromBlob(SharedMemBuffer blob) { return fromJson(objectIn(std::move(blob))); }

SharedMemBuffer withEntriesDigest(SharedMemBuffer metadata, std::string const& digest) {
    try {
        json::Object object = objectIn(metadata);
        if (!object.get(ENTRIES_DIGEST_KEY).isString())
            return metadata;
        object.set(ENTRIES_DIGEST_KEY, digest);
        return blobOf(object);
    } catch (json::Exc const&) {
        return metadata;
    }
}

MailedLetter letterIn(json::Object const& object) {
    MailedLetter letter{{}, Cfg::ExtractedFields(object.get(FIELDS_KEY).toArray())};
    for (json::Value const& document : object.get(DOCUMENTS_KEY).toArray())
        letter.documents.push_back(documentFrom(document.toObject()));
    letter.sheets = object.get(SHEETS_KEY).intOrZero();
    letter.colouredPages = object.get(COLOURED_PAGES_KEY).intOrZero();
    return letter;
}

bool isSameMailing(SharedMemBuffer const& a, SharedMemBuffer const& b) {
    auto const lasting = [](SharedMemBuffer const& metadata) {
        json::Object members;
        for (auto const& [key, value] : objectIn(metadata))
            if (key != std::string_view(ID_KEY) && key != std::string_view(CREATED_KEY) &&
                key != std::string_view(ENTRIES_DIGEST_KEY))
                members.set(key, value);
        return members;
    };
    return lasting(a) == lasting(b);
}

Cfg::PackPreset packPresetIn(json::Object const& metadata) {
    return Cfg::PackPreset(metadata, NOT_THE_PRESETS);
}

SharedMemBuffer withMembers(SharedMemBuffer metadata, json::Object const& members) {
    json::Object object = objectIn(metadata);
    bool isChanged = false;
    for (auto const& [key, value] : members) {
        isChanged = isChanged || object.get(key) != value;
        object.set(key, value);
    }
    return isChanged ? blobOf(object) : metadata;
}

} // namespace Mailing
