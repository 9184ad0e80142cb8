#include "programs/mailing/mailing_outline.h"

#include "programs/base/error.h"
#include "programs/mailing/json_walk.h"
#include "programs/mailing/metadata.h"
#include "programs/mailing/page_blob.h"
#include "vlservice/json/json_text.h"
#include "vlservice/pack/blob_format.h"

#include <algorithm>
#include <string>
#include <utility>

namespace Mailing {
namespace {

constexpr std::uint64_t MAX_BYTES = 256 << 20;

[[noreturn]] void fail() { throw Base::Error("it is no metadata of a mailing"); }

struct Sheets {
    long long oneSided = 0;
    long long bothSided = 0;
};

/// A key has to be there once. Any other way to spell it is none of ours.
void takeOnce(bool& isTaken) {
    if (std::exchange(isTaken, true))
        fail();
}

Sheets sheetsOfDocument(JsonWalk& walk) {
    bool hasPages = false;
    bool isBlank = false;
    long long pages = 0;
    walk.object([&](std::string_view key) {
        if (key == "\"pages\"") {
            takeOnce(hasPages);
            walk.array([&] {
                walk.value();
                ++pages;
            });
        } else {
            std::string_view const value = walk.value();
            isBlank = isBlank || (key == "\"role\"" && value == "\"blank\"");
        }
    });
    if (!hasPages)
        fail();
    return {pages, isBlank ? 0 : (pages + 1) / 2};
}

Sheets sheetsOfLetter(JsonWalk& walk) {
    bool hasDocuments = false;
    Sheets sheets;
    walk.object([&](std::string_view key) {
        if (key != "\"documents\"") {
            walk.value();
            return;
        }
        takeOnce(hasDocuments);
        walk.array([&] {
            Sheets const more = sheetsOfDocument(walk);
            sheets.oneSided += more.oneSided;
            sheets.bothSided += more.bothSided;
        });
    });
    if (!hasDocuments)
        fail();
    return sheets;
}

Sheets mostSheets(JsonWalk& walk) {
    Sheets most;
    walk.array([&] {
        Sheets const sheets = sheetsOfLetter(walk);
        most.oneSided = std::max(most.oneSided, sheets.oneSided);
        most.bothSided = std::max(most.bothSided, sheets.bothSided);
    });
    return most;
}

/// What its blob claims to hold.
std::uint64_t claimedBytes(SharedMemBuffer const& blob) {
    std::uint64_t bytes = 0;
    for (std::size_t i = DB_ZIP_HEADER_SIZE; blob.size() >= DB_ZIP_HEADER_SIZE && i > DB_ZIP_MAGIC.size();
         --i)
        bytes = bytes << 8 | blob.data()[i - 1];
    return bytes;
}

} // namespace

MailingOutline outlineIn(std::string_view text) {
    JsonWalk walk(text);
    bool hasLetters = false;
    Sheets most;
    std::string rest;
    walk.object([&](std::string_view key) {
        if (key == "\"letters\"") {
            takeOnce(hasLetters);
            most = mostSheets(walk);
        } else {
            rest += (rest.empty() ? "" : ",") + std::string(key) + ':' + std::string(walk.value());
        }
    });
    walk.end();
    rest = '{' + rest + '}';
    json::Object const preset = json::strToObject(rest.data(), rest.size());
    if (!hasLetters || preset.get("letters"))
        fail();
    MailingOutline outline{packPresetIn(preset), 0};
    outline.mostSheets = outline.packPreset.duplex() ? most.bothSided : most.oneSided;
    return outline;
}

MailingOutline outlineOf(SharedMemBuffer metadata) {
    if (claimedBytes(metadata) > MAX_BYTES)
        fail();
    SharedMemBuffer const text = expanded(std::move(metadata));
    return outlineIn(viewOf(text));
}

} // namespace Mailing
