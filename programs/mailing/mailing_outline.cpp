#include "programs/mailing/mailing_outline.h"

#include "programs/mailing/json_walk.h"
#include "programs/mailing/metadata.h"
#include "programs/mailing/metadata_text.h"
#include "programs/mailing/page_blob.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <string>
#include <utility>

namespace Mailing {
namespace {

struct Sheets {
    long long oneSided = 0;
    long long bothSided = 0;
};

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
        failAsMetadata();
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
        failAsMetadata();
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
        failAsMetadata();
    MailingOutline outline{packPresetIn(preset), 0};
    outline.mostSheets = outline.packPreset.duplex() ? most.bothSided : most.oneSided;
    return outline;
}

MailingOutline outlineOf(SharedMemBuffer metadata) {
    SharedMemBuffer const text = expandedMetadata(std::move(metadata));
    return outlineIn(viewOf(text));
}

} // namespace Mailing
