#pragma once
// A batch that is decided and not yet carried out, as a JSON document.

#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/reading.h"

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

namespace VlMail {

/// What was read from each document under which settings, with digests of all of them, so that it can be
/// carried out later exactly as decided, or refused when something has changed.
///
/// In JSON {"plan", "settings": {"file", "sha256"}, "documents": [{"file", "sha256", ...}], "outcome",
/// "used_documents", "digest"}: a document has beside its file the keys of DocumentReading::toJson(),
/// "outcome" is that of Dispatch::toJson() and is there to be read by people and programs, and "digest" is
/// over all the rest. Settings of a service stand in the plan, {"service", "place"}.
class Plan {
public:
    /// The settings may be the global defaults, which have no file. `used` are the letterheads and
    /// attachments.
    explicit Plan(NodeSettings const& settings, std::vector<UsedDocument> used = {});
    /// Throws Error when the file is no plan or was changed.
    static Plan fromFile(std::filesystem::path const& file);

    void add(DecidedDocument document) { documents_.push_back(std::move(document)); }
    std::vector<DecidedDocument> const& documents() const { return documents_; }

    /// The whole document as text; `outcome` comes from Dispatch::toJson().
    std::string toText(json::Object const& outcome) const;

    /// Of that document, where the definitions of letterSchema() are.
    static json::Object schema();

    /// Throws Error that names every document and settings file that is gone or has changed since.
    void requireUnchanged() const;
    NodeSettings settings() const;
    /// Whether it needs documents that a service keeps.
    bool usesService() const;
    /// Gives what a service keeps under a digest. Throws Error when that is nothing.
    using Fetch = std::function<std::string(std::string const& sha256)>;
    /// Prepares the letterheads and attachments that the plan was made with. Throws Error when one of them
    /// has changed.
    void prepare(MakingReady& making, Cfg::Presets const& presets, Workers const& workers,
                 Fetch const& fetch) const;

private:
    Plan() = default;

    void readSettings(json::Object const& settings);
    json::Value settingsToJson() const;
    DocumentFolder usedDocuments(Fetch const& fetch) const;

    /// Empty for the global defaults and for settings of a service.
    std::filesystem::path settingsFile_;
    std::string settingsSha256_;
    /// The answer of a service and how messages name it.
    json::Value answer_;
    std::string place_;
    std::vector<UsedDocument> usedDocuments_;
    std::vector<DecidedDocument> documents_;
};

} // namespace VlMail
