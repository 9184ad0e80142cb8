#pragma once
// Mailings that are made ready, with letters of several channels, for short tests.

#include "programs/mailing/container_writer.h"
#include "programs/mailing/metadata.h"
#include "programs/mailing/pack_database.h"
#include "tests/support/raw_pdf.h"
#include "tests/vlserviced/pack_help.h"

#include <filesystem>
#include <string>
#include <vector>

/// A field of a letter, which is an address unless its priority is 0.
inline void addField(Mailing::MailedLetter& letter, char const* name, json::Value value, int priority) {
    letter.fields.emplace(priority, Cfg::ExtractedField(name, std::move(value), priority, true,
                                                        IgnoreOnGroup::MustMatch,
                                                        Cfg::ExtractedField::ValueType::Plain));
}

/// A letter of one page for each of the channels, whose text tells its number; the empty channel is none.
inline Mailing::Metadata lettersOf(std::string const& id, std::vector<std::string> const& channels,
                                   std::string const& preset = "") {
    Mailing::Metadata mailing;
    mailing.id = id;
    mailing.packPreset = Mailing::packPresetIn(parse("{" + preset + R"("pack_preset": "Bills"})"));
    mailing.madeReady = true;
    for (std::size_t i = 0; i < channels.size(); ++i) {
        Mailing::MailedLetter& letter = mailing.letters.emplace_back();
        letter.documents.push_back({"letter " + std::to_string(i + 1) + ".pdf", {1}});
        letter.sheets = 1;
        if (!channels[i].empty())
            addField(letter, channels[i].c_str(), "to " + std::to_string(i + 1), 1);
    }
    return mailing;
}

inline std::string pdfOfLetter(std::size_t number) {
    return VLServiceTest::onePage("BT /F 10 Tf 72 700 Td (Letter " + std::to_string(number) + ") Tj ET")
        .bytes();
}

inline void saveLetters(PageSaverI& pages, Mailing::Metadata const& mailing) {
    for (std::size_t i = 0; i < mailing.letters.size(); ++i)
        pages.savePage(mailing.letters[i].documents.at(0).document, "1", zipped(pdfOfLetter(i + 1)));
}

inline void storeMailing(std::filesystem::path const& file, Mailing::Metadata const& mailing) {
    Mailing::PackDatabaseWriter writer(file, {mailing.id, "a=acme", "Title of " + mailing.id});
    saveLetters(writer, mailing);
    writer.finish(mailing.toBlob());
}

inline void storeLetters(std::filesystem::path const& file, std::string const& id,
                         std::vector<std::string> const& channels, std::string const& preset = "") {
    storeMailing(file, lettersOf(id, channels, preset));
}

/// The container of such a mailing.
inline void writeLetters(std::filesystem::path const& file, std::string const& id,
                         std::vector<std::string> const& channels, std::string const& preset = "") {
    Mailing::Metadata const mailing = lettersOf(id, channels, preset);
    Mailing::ContainerWriter writer(file, id);
    saveLetters(writer, mailing);
    writer.finish(mailing.toBlob(), "make room");
}
