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
            letter.fields.emplace(1, Cfg::ExtractedField(channels[i], "to " + std::to_string(i + 1), 1, true,
                                                         IgnoreOnGroup::MustMatch,
                                                         Cfg::ExtractedField::ValueType::Plain));
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

inline void storeLetters(std::filesystem::path const& file, std::string const& id,
                         std::vector<std::string> const& channels, std::string const& preset = "") {
    Mailing::Metadata const mailing = lettersOf(id, channels, preset);
    Mailing::PackDatabaseWriter writer(file, {id, "a=acme", "Title of " + id});
    saveLetters(writer, mailing);
    writer.finish(mailing.toBlob());
}

/// The container of such a mailing.
inline void writeLetters(std::filesystem::path const& file, std::string const& id,
                         std::vector<std::string> const& channels, std::string const& preset = "") {
    Mailing::Metadata const mailing = lettersOf(id, channels, preset);
    Mailing::ContainerWriter writer(file, id);
    saveLetters(writer, mailing);
    writer.finish(mailing.toBlob(), "make room");
}
