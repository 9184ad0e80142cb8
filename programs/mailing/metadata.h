#pragma once
// The metadata of a mailing, which stands in its container as one blob: what the pages belong to and how they
// go out.

#include "vlservice/extract/extracted_fields.h"
#include "vlservice/pack/shared_mem_buffer.h"
#include "vlservice/presets/pack_preset.h"

#include <string>
#include <vector>

namespace Base::Schema {
class Members;
} // namespace Base::Schema

namespace Mailing {

/// Pages of one document that belong to a letter. In a mailing that is made ready they begin on a front side
/// where sheets are printed on both.
struct DocumentPages {
    enum class Role {
        Letter,
        Attachment,
        Blank, ///< the other side of the sheet in front of it
    };

    /// As the container names the document.
    std::string document;
    /// From 1, in the order in which they go out.
    std::vector<int> pages;
    Role role = Role::Letter;
};

/// One letter, or several that go out as one because they are addressed alike.
struct MailedLetter {
    std::vector<DocumentPages> documents;
    Cfg::ExtractedFields fields;
    /// Of paper, where the mailing is made ready.
    long long sheets = 0;
    /// Of the pages that are printed in colour, where the mailing is made ready.
    long long colouredPages = 0;
    /// Of each letter that goes out in it, by which the service knows it again: 64 hexadecimal digits; none
    /// in older mailings.
    std::vector<std::string> digests = {};
};

/// The channel that a letter goes by first: the name of its primary address, empty without one.
std::string channelOf(MailedLetter const& letter);

/// A letterhead or an attachment that is on or among the pages.
struct UsedDocument {
    /// As the pack preset has it.
    std::string id;
    /// Of the document, 64 hexadecimal digits.
    std::string sha256;
};

/// As schemas name the object of a letter's field.
inline constexpr char const* EXTRACTED_FIELD = "extracted_field";

inline constexpr char const* PURCHASE_ORDER_KEY = "purchase_order";
inline constexpr char const* AGAIN_KEY = "again";

/// In JSON one object: the pack preset in its embedded form, which names it under "pack_preset", and beside
/// its keys "id", "created", "letters", "made_ready", "used_documents", "entries_digest",
/// "purchase_order" and "again".
struct Metadata {
    std::string id;
    /// Seconds since the epoch, UTC.
    long long created = 0;
    Cfg::PackPreset packPreset;
    std::vector<MailedLetter> letters;
    /// EntriesDigest of the pages, which is known when the last of them is stored; empty in older mailings.
    std::string entriesDigest = {};
    /// That the mailing goes by; empty when there is none.
    std::string purchaseOrder = {};
    /// The pages are the sides that are printed, with all that lies on them, and blank ones among them:
    /// nobody lays a letterhead on them or adds an attachment. Older mailings are not.
    bool madeReady = false;
    std::vector<UsedDocument> usedDocuments = {};
    /// Why its letters go out although they did before; empty where they are not to.
    std::string again = {};

    json::Object toJson() const;
    /// Throws std::exception when a key has not the form above.
    static Metadata fromJson(json::Object const& object);
    /// Its keys beside those of the pack preset, as a JSON schema's; fields are the definition
    /// EXTRACTED_FIELD.
    static void describe(Base::Schema::Members& into);

    /// The compressed JSON text, as the container takes it. Throws Error when there is no memory for it.
    SharedMemBuffer toBlob() const;
    /// Throws std::exception when the blob cannot be expanded or holds something else.
    static Metadata fromBlob(SharedMemBuffer blob);
};

/// The same metadata, whatever else is in it, with another digest, for pages that are stored anew. Metadata
/// that has none stays as it is.
SharedMemBuffer withEntriesDigest(SharedMemBuffer metadata, std::string const& digest);

/// The letter that an object among "letters" stands for. Throws std::exception.
MailedLetter letterIn(json::Object const& object);

/// Whether two mailings' metadata say the same but for id and time, and what is computed with the id. Throws
/// std::exception when a blob cannot be read.
bool isSameMailing(SharedMemBuffer const& a, SharedMemBuffer const& b);

/// The pack preset that an object of metadata holds beside its own keys. Throws std::exception.
Cfg::PackPreset packPresetIn(json::Object const& metadata);

/// The same metadata, whatever else is in it, with these members. Throws std::exception when the blob cannot
/// be read.
SharedMemBuffer withMembers(SharedMemBuffer metadata, json::Object const& members);

} // namespace Mailing
