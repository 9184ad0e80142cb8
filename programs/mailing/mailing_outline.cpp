#include "programs/mailing/mailing_outline.h"

#include "programs/base/digest.h"
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

Sheets sheetsOfDocuments(JsonWalk& walk) {
    Sheets sheets;
    walk.array([&] {
        Sheets const more = sheetsOfDocument(walk);
        sheets.oneSided += more.oneSided;
        sheets.bothSided += more.bothSided;
    });
    return sheets;
}

/// Of its text in quotes.
std::string digestIn(std::string_view quoted) {
    constexpr std::size_t QUOTES = 2;
    if (quoted.size() != Base::SHA256_DIGITS + QUOTES)
        failAsMetadata();
    std::string digest(quoted.substr(1, Base::SHA256_DIGITS));
    if (!Base::isSha256(digest))
        failAsMetadata();
    return digest;
}

/// What the letters are on paper, and by what they are known again.
class LettersWalk {
public:
    explicit LettersWalk(JsonWalk& walk) : walk_(walk) {}

    void all() {
        walk_.array([this] {
            ++number_;
            letter();
        });
    }
    Sheets const& most() const { return most_; }
    std::vector<LetterDigest> takeDigests() { return std::move(digests_); }

private:
    void letter() {
        bool hasDocuments = false;
        bool hasDigests = false;
        walk_.object([&](std::string_view key) {
            if (key == "\"documents\"") {
                takeOnce(hasDocuments);
                count(sheetsOfDocuments(walk_));
            } else if (key == "\"digests\"") {
                takeOnce(hasDigests);
                walk_.array([this] { digests_.push_back({digestIn(walk_.value()), number_}); });
            } else {
                walk_.value();
            }
        });
        if (!hasDocuments)
            failAsMetadata();
    }
    void count(Sheets const& sheets) {
        most_.oneSided = std::max(most_.oneSided, sheets.oneSided);
        most_.bothSided = std::max(most_.bothSided, sheets.bothSided);
    }

    JsonWalk& walk_;
    long long number_ = 0;
    Sheets most_;
    std::vector<LetterDigest> digests_;
};

} // namespace

MailingOutline outlineIn(std::string_view text) {
    JsonWalk walk(text);
    bool hasLetters = false;
    LettersWalk letters(walk);
    std::string rest;
    walk.object([&](std::string_view key) {
        if (key == "\"letters\"") {
            takeOnce(hasLetters);
            letters.all();
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
    outline.mostSheets = outline.packPreset.duplex() ? letters.most().bothSided : letters.most().oneSided;
    outline.digests = letters.takeDigests();
    outline.again = preset.get(AGAIN_KEY).textOrEmpty();
    return outline;
}

MailingOutline outlineOf(SharedMemBuffer metadata) {
    SharedMemBuffer const text = expandedMetadata(std::move(metadata));
    return outlineIn(viewOf(text));
}

} // namespace Mailing
