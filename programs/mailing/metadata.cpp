#include "programs/mailing/metadata.h"

#include "programs/base/json_rows.h"
#include "programs/mailing/page_blob.h"
#include "vlservice/json/json_form.h"
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
constexpr char const* DIGESTS_KEY = "digests";

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
Role roleNamed(std::string const& name) {
    auto const found =
        std::find_if(ROLES.begin(), ROLES.end(), [&](auto const& one) { return one.second == name; });
    return found == ROLES.end() ? Role::Letter : found->first;
}

std::vector<int> pagesIn(json::Value const& array) {
    std::vector<int> pages;
    for (json::Value const& page : array.toArray())
        pages.push_back(static_cast<int>(page.toInt()));
    return pages;
}

namespace Schema = Base::Schema;
using Base::Presence;

json::Object rolesSchema() {
    json::Array names;
    for (auto const& [role, name] : ROLES)
        names.append(name);
    return {{"enum", names}};
}

constexpr Base::JsonRow<DocumentPages> DOCUMENT_ROWS[] = {
    {NAME_KEY, Presence::Always, &Schema::text,
     [](DocumentPages const& document) -> json::Value { return document.document; },
     [](json::Value const& node, DocumentPages& document) { document.document = node.toString(); }},
    {PAGES_KEY, Presence::Always, [] { return Schema::listOf(Schema::integer(1)); },
     [](DocumentPages const& document) -> json::Value {
         return json::Form<std::vector<int>>::write(document.pages);
     },
     [](json::Value const& node, DocumentPages& document) { document.pages = pagesIn(node); }},
    {ROLE_KEY, Presence::WhenThere, &rolesSchema,
     [](DocumentPages const& document) -> json::Value { return nameOf(document.role); },
     [](json::Value const& node, DocumentPages& document) { document.role = roleNamed(node.textOrEmpty()); }},
};

template<typename Record>
json::Array listOf(std::vector<Record> const& all, std::span<Base::JsonRow<Record> const> rows) {
    json::Array array;
    for (Record const& each : all) {
        json::Object object;
        Base::writeRows(rows, each, object);
        array.append(object);
    }
    return array;
}

template<typename Record>
std::vector<Record> recordsIn(json::Array const& array, std::span<Base::JsonRow<Record> const> rows) {
    std::vector<Record> records;
    for (json::Value const& object : array)
        Base::readRows(rows, object.toObject(), records.emplace_back());
    return records;
}

constexpr Base::JsonRow<MailedLetter> LETTER_ROWS[] = {
    {DOCUMENTS_KEY, Presence::Always,
     [] { return Schema::listOf(Base::schemaOf<DocumentPages>(DOCUMENT_ROWS)); },
     [](MailedLetter const& letter) -> json::Value {
         return listOf<DocumentPages>(letter.documents, DOCUMENT_ROWS);
     },
     [](json::Value const& node, MailedLetter& letter) {
         letter.documents = recordsIn<DocumentPages>(node.toArray(), DOCUMENT_ROWS);
     }},
    {FIELDS_KEY, Presence::Always, [] { return Schema::listOf(Schema::definition(EXTRACTED_FIELD)); },
     [](MailedLetter const& letter) -> json::Value { return letter.fields.serialize(); },
     [](json::Value const& node, MailedLetter& letter) {
         letter.fields = Cfg::ExtractedFields(node.toArray());
     }},
    {DIGESTS_KEY, Presence::WhenThere, [] { return Schema::listOf(Schema::text()); },
     [](MailedLetter const& letter) {
         return letter.digests.empty()
                    ? json::Value()
                    : json::Value(json::Form<std::vector<std::string>>::write(letter.digests));
     },
     [](json::Value const& node, MailedLetter& letter) {
         if (node.isArray())
             letter.digests = json::Form<std::vector<std::string>>::read(node);
     }},
};

/// Where the mailing is made ready.
constexpr Base::JsonRow<MailedLetter> MADE_READY_ROWS[] = {
    {SHEETS_KEY, Presence::WhenThere, [] { return Schema::integer(0); },
     [](MailedLetter const& letter) -> json::Value { return letter.sheets; },
     [](json::Value const& node, MailedLetter& letter) { letter.sheets = node.intOrZero(); }},
    {COLOURED_PAGES_KEY, Presence::WhenThere, [] { return Schema::integer(0); },
     [](MailedLetter const& letter) -> json::Value { return letter.colouredPages; },
     [](json::Value const& node, MailedLetter& letter) { letter.colouredPages = node.intOrZero(); }},
};

json::Object letterSchema() {
    Schema::Members members(Schema::Members::Others::Refused);
    Base::describeRows<MailedLetter>(LETTER_ROWS, members);
    Base::describeRows<MailedLetter>(MADE_READY_ROWS, members);
    return members.schema();
}

json::Array lettersToJson(Metadata const& metadata) {
    json::Array all;
    for (MailedLetter const& letter : metadata.letters) {
        json::Object object;
        Base::writeRows<MailedLetter>(LETTER_ROWS, letter, object);
        if (metadata.madeReady)
            Base::writeRows<MailedLetter>(MADE_READY_ROWS, letter, object);
        all.append(object);
    }
    return all;
}

constexpr Base::JsonRow<UsedDocument> USED_ROWS[] = {
    {ID_KEY, Presence::Always, &Schema::text,
     [](UsedDocument const& document) -> json::Value { return document.id; },
     [](json::Value const& node, UsedDocument& document) { document.id = node.toString(); }},
    {SHA256_KEY, Presence::Always, &Schema::text,
     [](UsedDocument const& document) -> json::Value { return document.sha256; },
     [](json::Value const& node, UsedDocument& document) { document.sha256 = node.toString(); }},
};

json::Value unlessEmpty(std::string const& text) { return text.empty() ? json::Value() : json::Value(text); }

/// Beside the pack preset's own keys; its name is not among them.
constexpr Base::JsonRow<Metadata> ROWS[] = {
    {ID_KEY, Presence::Always, &Schema::text,
     [](Metadata const& metadata) -> json::Value { return metadata.id; },
     [](json::Value const& node, Metadata& metadata) { metadata.id = node.toString(); }},
    {CREATED_KEY, Presence::Always, [] { return Schema::integer(); },
     [](Metadata const& metadata) -> json::Value { return metadata.created; },
     [](json::Value const& node, Metadata& metadata) { metadata.created = node.toInt(); }},
    {LETTERS_KEY, Presence::Always, [] { return Schema::listOf(letterSchema()); },
     [](Metadata const& metadata) -> json::Value { return lettersToJson(metadata); },
     [](json::Value const& node, Metadata& metadata) {
         for (json::Value const& letter : node.toArray())
             metadata.letters.push_back(letterIn(letter.toObject()));
     }},
    {MADE_READY_KEY, Presence::WhenThere, &Schema::flag,
     [](Metadata const& metadata) { return metadata.madeReady ? json::Value(true) : json::Value(); },
     [](json::Value const& node, Metadata& metadata) { metadata.madeReady = node.isTrue(); }},
    {USED_DOCUMENTS_KEY, Presence::WhenThere,
     [] { return Schema::listOf(Base::schemaOf<UsedDocument>(USED_ROWS)); },
     [](Metadata const& metadata) {
         return metadata.usedDocuments.empty() ? json::Value()
                                               : listOf<UsedDocument>(metadata.usedDocuments, USED_ROWS);
     },
     [](json::Value const& node, Metadata& metadata) {
         if (node)
             metadata.usedDocuments = recordsIn<UsedDocument>(node.toArray(), USED_ROWS);
     }},
    {ENTRIES_DIGEST_KEY, Presence::WhenThere, &Schema::text,
     [](Metadata const& metadata) { return unlessEmpty(metadata.entriesDigest); },
     [](json::Value const& node, Metadata& metadata) { metadata.entriesDigest = node.textOrEmpty(); }},
    {PURCHASE_ORDER_KEY, Presence::WhenThere, &Schema::text,
     [](Metadata const& metadata) { return unlessEmpty(metadata.purchaseOrder); },
     [](json::Value const& node, Metadata& metadata) { metadata.purchaseOrder = node.textOrEmpty(); }},
    {AGAIN_KEY, Presence::WhenThere, &Schema::text,
     [](Metadata const& metadata) { return unlessEmpty(metadata.again); },
     [](json::Value const& node, Metadata& metadata) { metadata.again = node.textOrEmpty(); }},
};

constexpr char const* PACK_PRESET_KEY = "pack_preset";

/// What is not the pack preset's in the object that it shares; its name's key is listed so that the name is
/// not taken for an unknown key as well.
std::unordered_set<std::string> const& notThePresets() {
    static auto const keys = [] {
        std::unordered_set<std::string> names{PACK_PRESET_KEY};
        for (auto const& row : ROWS)
            names.insert(row.name);
        return names;
    }();
    return keys;
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

std::string channelOf(MailedLetter const& letter) {
    Cfg::ExtractedField const* const address = letter.fields.primaryAddressField();
    return address ? address->name() : std::string();
}

json::Object Metadata::toJson() const {
    json::Object object = packPreset.serialize(true);
    Base::writeRows<Metadata>(ROWS, *this, object);
    return object;
}

Metadata Metadata::fromJson(json::Object const& object) {
    Metadata metadata;
    metadata.packPreset = packPresetIn(object);
    Base::readRows<Metadata>(ROWS, object, metadata);
    return metadata;
}

void Metadata::describe(Schema::Members& into) {
    into.require(PACK_PRESET_KEY, Schema::text());
    Base::describeRows<Metadata>(ROWS, into);
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
    MailedLetter letter;
    Base::readRows<MailedLetter>(LETTER_ROWS, object, letter);
    Base::readRows<MailedLetter>(MADE_READY_ROWS, object, letter);
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
    return Cfg::PackPreset(metadata, notThePresets());
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
