#pragma once
// What the reading process does: documents by settings that are being written.

#include "programs/protocol/settings.h"
#include "programs/vlmail/workbench/answer.h"
#include "programs/vlmail/workbench/folders.h"
#include "programs/vlmail/workbench/kept_documents.h"
#include "programs/vlmail/workbench/kept_making.h"
#include "programs/vlmail/workbench/printed_picture.h"
#include "programs/vlmail/workbench/settings_in_work.h"
#include "programs/vlmail/workbench/verdict.h"

#include "vlservice/json/json.h"

#include <list>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace VlMail::Workbench {

/// The parameter of whatever has settings that tells what they inherit, as StoredSettings has it.
constexpr char const* INHERITED = "inherited";

/// Keeps what it has read and what it has understood of settings, so that a change of a pattern costs the
/// search for it alone. Used by one process.
class Desk {
public:
    explicit Desk(Folders folders) : folders_(std::move(folders)), making_(folders_) {}

    /// What is asked, such as "evaluate", and its parameters as JSON. Failures are answers.
    Answer answer(std::string const& what, std::string const& query);

    // Each takes its parameters and throws Base::Error or json::Exc.

    Answer evaluate(json::Object const& query);
    Answer lint(json::Object const& query);
    Answer edit(json::Object const& query);
    /// Of a page as it was read; with settings as it is printed, and of any side that goes out with its
    /// letter.
    Answer picture(json::Object const& query);
    Answer blocks(json::Object const& query);
    /// Of one document, against the settings before where they are told.
    Answer verdict(json::Object const& query);
    /// What would be kept as a golden case.
    Answer expectation(json::Object const& query);
    /// A new preset from documents, and the settings with it.
    Answer propose(json::Object const& query) const;
    Answer adopt(json::Object const& query);

private:
    /// Verdicts by settings, for the document of that file.
    struct Judged {
        FileMark document;
        std::optional<FileMark> expectation;
        DocumentVerdict verdict;
    };

    void inherit(std::string const& told);
    SettingsInWork& settings(json::Object const& query) {
        return settingsOf(query.get("settings").toString());
    }
    SettingsInWork& settingsOf(std::string const& text);
    /// What the picture before was made from: those of one document come one behind the other.
    struct KeptLetters {
        std::string settings;
        std::filesystem::path file;
        FileMark mark;
        PrintedLetters letters;
    };

    PrintedLetters const& printedLetters(json::Object const& query, Along::Checks checks);
    Reader::Document& document(json::Object const& query);
    DocumentReading readingOf(std::string const& name, SettingsInWork& settings);
    std::string printedPage(json::Object const& query, int page, double dotsPerInch);
    DocumentVerdict const& judge(std::string const& text, std::string const& document);

    Folders folders_;
    KeptDocuments documents_;
    KeptMaking making_;
    /// As it was told, and what it means; null for nothing.
    std::string inheritedText_;
    std::shared_ptr<Protocol::SettingsAnswer const> inherited_;
    std::optional<KeptLetters> letters_;
    /// The last are the first.
    std::list<SettingsInWork> settings_;
    std::list<std::pair<std::string, std::map<std::string, Judged>>> judged_;
};

} // namespace VlMail::Workbench
