#include "programs/mailing/letter_texts.h"

#include "programs/mailing/json_walk.h"
#include "programs/mailing/metadata_text.h"
#include "programs/mailing/page_blob.h"
#include "vlservice/json/json_text.h"

#include <sstream>
#include <utility>

namespace Mailing {
namespace {

constexpr char const* LETTERS = "letters";
constexpr char const* ENTRIES_DIGEST = "entries_digest";

/// The texts of the letters; what stands beside them is added to `rest`.
std::vector<std::string_view> lettersIn(std::string_view text, std::string& rest) {
    JsonWalk walk(text);
    bool hasLetters = false;
    std::vector<std::string_view> letters;
    walk.object([&](std::string_view key) {
        if (key == "\"letters\"") {
            takeOnce(hasLetters);
            walk.array([&] { letters.push_back(walk.value()); });
        } else {
            rest += (rest.empty() ? "" : ",") + std::string(key) + ':' + std::string(walk.value());
        }
    });
    walk.end();
    if (!hasLetters)
        failAsMetadata();
    return letters;
}

} // namespace

LetterTexts::LetterTexts(SharedMemBuffer metadata) : text_(expandedMetadata(std::move(metadata))) {
    std::string rest;
    letters_ = lettersIn(viewOf(text_), rest);
    rest = '{' + rest + '}';
    rest_ = json::strToObject(rest.data(), rest.size());
    if (rest_.get(LETTERS))
        failAsMetadata();
    json::Object without = rest_;
    without.set(LETTERS, json::Array());
    mailing_ = Metadata::fromJson(without);
}

MailedLetter LetterTexts::letter(std::size_t index) const {
    std::string_view const text = letters_.at(index);
    return letterIn(json::strToObject(text.data(), text.size()));
}

SharedMemBuffer LetterTexts::withLetters(std::vector<std::size_t> const& indexes,
                                         std::string const& digest) const {
    json::Object rest = rest_;
    if (rest.get(ENTRIES_DIGEST))
        rest.set(ENTRIES_DIGEST, digest);
    std::ostringstream out;
    out << rest;
    std::string text = out.str();
    text.pop_back();
    text += (rest.empty() ? "" : ",") + ("\"" + std::string(LETTERS) + "\":[");
    for (std::size_t const index : indexes)
        text += (text.back() == '[' ? "" : ",") + std::string(letters_.at(index));
    return compressed(text + "]}");
}

} // namespace Mailing
