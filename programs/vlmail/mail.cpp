// vlmail mail: the whole road, from documents to one mailing file per pack preset.
#include "programs/mailing/pending_file.h"
#include "programs/vlmail/batch.h"
#include "programs/vlmail/command.h"
#include "programs/vlmail/mailing_builder.h"
#include "programs/vlmail/node_settings.h"
#include "programs/vlmail/outcome.h"
#include "programs/vlmail/text_table.h"
#include "programs/vlmail/worker_pool.h"
#include "vlservice/pack/pack_wrapper.h"
#include "vlservice/platform/json_text.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <ctime>
#include <filesystem>
#include <map>
#include <memory>
#include <ostream>
#include <random>
#include <sstream>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

constexpr char const* MAILING_ENDING = ".mailing";

struct Options {
    std::vector<std::string> files;
    std::string settings;
    std::string folder;
    bool json = false;
    std::size_t jobs = processorCount();
};

/// Sorts by time of making and never comes twice.
std::string newMailingId(std::time_t now) {
    char time[32];
    std::tm utc{};
    std::strftime(time, sizeof time, "%Y%m%dT%H%M%SZ", gmtime_r(&now, &utc));
    std::random_device random;
    std::ostringstream id;
    id << time << '-' << std::hex;
    id.width(8);
    id.fill('0');
    id << random();
    return id.str();
}

/// A mailing on its way into a file.
class OutgoingMailing {
public:
    OutgoingMailing(fs::path const& folder, Cfg::PackPreset const& preset, std::time_t now)
        : OutgoingMailing(folder, preset, now, newMailingId(now)) {}

    MailingBuilder& builder() { return builder_; }
    fs::path const& file() const { return file_.target(); }

    /// Gives the file its name. Throws Error; nothing stands under that name then.
    void finish() {
        if (!container_.finalizeOutput(builder_.metadata().toBlob()))
            throw Error("cannot write the mailing \"" + file().string() +
                        "\"; see the line above, make room on the disk and mail again");
        file_.commit();
    }

private:
    OutgoingMailing(fs::path const& folder, Cfg::PackPreset const& preset, std::time_t now,
                    std::string const& id)
        : file_(folder / (id + MAILING_ENDING)),
          container_(file_.temporary().string(), PackWrapper::PURPOSE_OUTPUT, id),
          builder_(container_, id, preset, now) {}

    Mailing::PendingFile file_;
    PackWrapper container_;
    MailingBuilder builder_;
};

/// A letter that stays behind.
struct LeftOut {
    std::string document;
    std::vector<int> pages;
    std::string reason;
};

class MailRun {
public:
    MailRun(Options const& options, Terminal const& terminal)
        : options_(options), terminal_(terminal),
          settings_(options.settings.empty() ? NodeSettings() : NodeSettings::fromFile(options.settings)),
          presets_(settings_.presets()) {}

    int run() {
        makeFolder();
        readBatch(options_.files, settings_, options_.jobs, WithPages::Yes, terminal_,
                  [&](std::size_t, ReadResult result) { take(std::move(result)); });
        finishMailings();
        if (options_.json)
            printJson();
        else
            print();
        return outcome_.exitStatus();
    }

private:
    void makeFolder() const {
        std::error_code failure;
        fs::create_directories(options_.folder, failure);
        if (failure)
            throw Error("cannot make the folder \"" + options_.folder + "\": " + failure.message() +
                        "; name another with -o");
    }

    void take(ReadResult result) {
        DocumentReading& reading = result.reading;
        outcome_.count(reading);
        if (reading.failed()) {
            failures_.push_back({reading.document, {}, reading.error});
            terminal_.complain(reading.error);
        } else if (reading.isAttachment()) {
            attachments_.push_back(reading.document);
        } else {
            mailLetters(reading, result.pages);
        }
    }

    void mailLetters(DocumentReading& reading, std::vector<std::vector<PageBlob>> const& pages) {
        std::string name;
        for (std::size_t i = 0; i < reading.letters->size(); ++i) {
            LetterReading& letter = (*reading.letters)[i];
            std::string const why = letter.whyNot();
            if (!why.empty()) {
                leftOut_.push_back({reading.document, letter.pages, why});
                continue;
            }
            MailingBuilder& mailing = mailingFor(reading.packPreset).builder();
            if (name.empty())
                name = mailing.nameFor(reading.document);
            mailing.add(name, std::move(letter), pages[i]);
        }
    }

    OutgoingMailing& mailingFor(std::string const& packPreset) {
        auto& mailing = mailings_[packPreset];
        if (!mailing)
            mailing = std::make_unique<OutgoingMailing>(options_.folder, presetNamed(packPreset), now_);
        return *mailing;
    }

    /// The one that findMatch has found: the first of the name.
    Cfg::PackPreset const& presetNamed(std::string const& name) const {
        auto const& all = presets_.elements<Cfg::PresetFieldIdxs::PackPresets>();
        auto const found = std::find_if(all.begin(), all.end(),
                                        [&](auto const& element) { return element.value.name() == name; });
        return found->value;
    }

    void finishMailings() {
        for (auto const& [packPreset, mailing] : mailings_) {
            try {
                mailing->finish();
                written_.push_back(mailing.get());
            } catch (std::exception const& failure) {
                outcome_.fail();
                failures_.push_back({packPreset, {}, failure.what()});
                terminal_.complain(failure.what());
            }
        }
    }

    void print() const {
        TextTable table({{"mailing"},
                         {"pack preset"},
                         {"letters", TextTable::Align::Right},
                         {"sent as", TextTable::Align::Right},
                         {"pages", TextTable::Align::Right}});
        for (OutgoingMailing* const mailing : written_) {
            MailingBuilder const& builder = mailing->builder();
            table.addRow({mailing->file().string(), builder.metadata().packPreset.name(),
                          std::to_string(builder.letterCount()),
                          std::to_string(builder.metadata().letters.size()),
                          std::to_string(builder.pageCount())});
        }
        if (!table.empty())
            table.print(terminal_.out);
        for (std::string const& document : attachments_)
            terminal_.out << "not a letter: " << document << ", an attachment\n";
        for (LeftOut const& letter : leftOut_)
            terminal_.out << "left out: " << letter.document << ", " << pagesInWords(letter.pages) << ": "
                          << letter.reason << '\n';
        terminal_.out << outcome_.inWords() << '\n';
    }

    void printJson() const {
        json::Array mailings;
        for (OutgoingMailing* const mailing : written_) {
            MailingBuilder const& builder = mailing->builder();
            mailings.append(json::Object{{"id", builder.metadata().id},
                                         {"file", mailing->file().string()},
                                         {"pack_preset", builder.metadata().packPreset.name()},
                                         {"letters", builder.letterCount()},
                                         {"sent_as", builder.metadata().letters.size()},
                                         {"pages", builder.pageCount()}});
        }
        terminal_.out << json::Object{{"mailings", mailings},
                                      {"left_out", toJson(leftOut_)},
                                      {"attachments", toJson(attachments_)},
                                      {"failures", toJson(failures_)}}
                      << '\n';
    }

    static json::Array toJson(std::vector<LeftOut> const& letters) {
        json::Array array;
        for (LeftOut const& letter : letters) {
            json::Object object{{"document", letter.document}, {"reason", letter.reason}};
            json::Array pages;
            for (int const page : letter.pages)
                pages.append(page);
            if (!pages.empty())
                object.set("pages", pages);
            array.append(object);
        }
        return array;
    }

    static json::Array toJson(std::vector<std::string> const& names) {
        json::Array array;
        for (std::string const& name : names)
            array.append(name);
        return array;
    }

    Options const& options_;
    Terminal const& terminal_;
    NodeSettings settings_;
    Cfg::Presets presets_;
    std::time_t now_ = std::time(nullptr);
    /// By the pack preset's name, so that the same documents give the same order of files.
    std::map<std::string, std::unique_ptr<OutgoingMailing>> mailings_;
    std::vector<OutgoingMailing*> written_;
    std::vector<LeftOut> leftOut_;
    std::vector<LeftOut> failures_;
    std::vector<std::string> attachments_;
    Outcome outcome_;
};

} // namespace

void addMailCommand(CLI::App& app, Task& task) {
    auto const options = std::make_shared<Options>();
    CLI::App* const mail =
        app.add_subcommand("mail", "Packs the letters in documents, one mailing file a pack preset");
    mail->add_option("FILE", options->files, "PDF or text documents")->required();
    mail->add_option("--settings", options->settings, "A JSON document with settings parts of a node");
    mail->add_option("-o,--output", options->folder, "The folder for the mailing files; made when missing")
        ->required();
    mail->add_flag("--json", options->json, "The outcome as one JSON object");
    mail->add_option("--jobs", options->jobs, "Processes to read with")->check(CLI::PositiveNumber);
    mail->callback(
        [=, &task] { task = [=](Terminal const& terminal) { return MailRun(*options, terminal).run(); }; });
}

} // namespace VlMail
