#pragma once
// Parcels for carriers, and what became of them.

#include "programs/base/marked_folder.h"
#include "programs/carriers/carrier.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <set>
#include <string>
#include <vector>

/// Letters of a page each, to these addresses.
inline Carriers::Parcel parcelOf(std::string const& key, std::vector<std::string> const& addresses) {
    Carriers::Parcel parcel;
    parcel.key = key;
    parcel.mailing = "p1";
    parcel.document = "%PDF of " + key;
    for (std::string const& address : addresses) {
        Carriers::OutgoingLetter& letter = parcel.letters.emplace_back();
        letter.number = static_cast<long long>(parcel.letters.size());
        letter.key = "p1-" + std::to_string(letter.number);
        letter.address = address;
        letter.firstPage = ++parcel.pages;
        letter.pages = 1;
        letter.sheets = 1;
    }
    return parcel;
}

/// What can be handed over again is put on record afterwards alone.
inline void noRecord() { ADD_FAILURE() << "was put on record before"; }

/// Of the files in a folder, but for its mark.
inline std::set<std::string> namesIn(std::filesystem::path const& folder) {
    std::set<std::string> names;
    for (auto const& entry : std::filesystem::directory_iterator(folder))
        names.insert(entry.path().filename().string());
    names.erase(Base::MarkedFolder::MARK_FILE);
    return names;
}
