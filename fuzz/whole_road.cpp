// A small document on all of its road: read by settings, its fields found, its letters written into a mailing
// file as vlmail does, and that file read again. What goes out is whole, and what stays behind has a reason.
#include "fuzz/private_folder.h"
#include "programs/base/error.h"
#include "programs/base/plain_stream.h"
#include "programs/mailing/page_blob.h"
#include "programs/reader/document.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/mailings/dispatch.h"
#include "programs/vlmail/pack/container_check.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string_view>
#include <utility>

namespace {

namespace fs = std::filesystem;

constexpr std::string_view SETTINGS = R"json({"presets": {
"extract_presets": [{"match": ".*", "pack_preset": "Letters", "zones": [
    {"name": "Window", "location": {"left": 1800, "top": 4000, "right": 11000, "bottom": 9500}, "fields": [
        {"name": "email", "priority": 2, "send_to_server": true,
         "value_extract": "^(?i:mail):\\h*(?<VAL>.*)$", "value_match": "\\S.*@\\S.*\\.\\S.*"},
        {"name": "postal", "priority": 1, "send_to_server": true, "width": 14000,
         "value_extract": "\\A(?<VAL>(.{1,72}\\n){0,8}.{1,72})\\Z",
         "value_match": "(.{1,72}(\\n|$)){2,7}"}]},
    {"name": "Text", "location": {"left": 0, "top": 9500, "right": 21000, "bottom": 29700}, "fields": [
        {"name": "total", "value_type": 2, "value_min": 0, "value_extract": "^Total:\\h*(?<VAL>.+)$"},
        {"name": "count", "value_type": 1, "value_extract": "^Count:\\h*(?<VAL>.+)$", "ignore_on_group": 1},
        {"name": "date", "value_type": 3, "value_extract": "^Date:\\h*(?<VAL>.+)$",
         "value_match": "(?<day>\\d{1,2})\\. (?<month>\\w+) (?<year>\\d{4})"},
        {"name": "ref", "mark": 1, "send_to_server": true, "value_extract": "^Ref:\\h*(?<VAL>.+)$"}]},
    {"name": "Behind", "location": {"left": 0, "top": 0, "right": 9000, "bottom": 3000}, "fields": [
        {"name": "behind", "value_extract": "^(?<VAL>.+)$"}]}]}],
"pack_presets": [{"name": "Letters", "process_mode": 3,
    "reading": {"decimal": ",", "grouping": ".", "months": "de",
                "zones": {"Behind": {"page": "any", "anchor": "^Ref:", "column": true}}}}]}})json";

void require(bool holds) {
    if (!holds)
        std::abort();
}

VlMail::NodeSettings const& settings() {
    static auto const settings = VlMail::NodeSettings::resolved(
        json::strToObject(SETTINGS.data(), SETTINGS.size()), "the settings of the target");
    return settings;
}

fs::path written(std::uint8_t const* data, std::size_t size) {
    fs::path const file = privateFolder() / "letter.pdf";
    std::ofstream(file, std::ios::binary)
        .write(reinterpret_cast<char const*>(data), static_cast<std::streamsize>(size));
    return file;
}

/// How many pages go out.
std::size_t lookAtReading(VlMail::DocumentReading const& reading) {
    require(reading.error.find('\n') == std::string::npos);
    std::size_t pages = 0;
    if (!reading.failed())
        for (VlMail::LetterReading const& letter : reading.letters.value()) {
            require(!letter.pages.empty());
            require(letter.blobs.size() == (letter.whyNot().empty() ? letter.pages.size() : 0));
            pages += letter.blobs.size();
        }
    return pages;
}

void lookAtMailing(fs::path const& file, std::size_t pages) {
    VlMail::ContainerFile container(file);
    VlMail::ContainerCheck const check = VlMail::checkContainer(container);
    require(check.damages.empty() && check.pages == pages);
    for (unsigned long long i = 0; i < container.size(); ++i)
        if (VlMail::isPage(container.entry(i))) {
            SharedMemBuffer const page = Mailing::expanded(container.blob(i).bytes);
            require(Reader::openDocument(std::string(Mailing::viewOf(page)), "page").pageCount() == 1);
        }
}

void lookAtMailings(fs::path const& folder, std::size_t pages) {
    std::size_t mailings = 0;
    for (fs::directory_entry const& entry : fs::directory_iterator(folder)) {
        require(entry.path().extension() == ".mailing");
        lookAtMailing(entry.path(), pages);
        ++mailings;
    }
    require(mailings == (pages > 0 ? 1 : 0));
}

void mail(VlMail::ReadResult result, Cfg::Presets const& presets, fs::path const& folder) {
    std::size_t const pages = lookAtReading(result.reading);
    std::ostringstream text;
    Base::PlainStream out(text);
    VlMail::Terminal const terminal{out, out};
    VlMail::MakingReady const making;
    // Letters of any length.
    Policy::SourcedSettings const settings({{"app", json::Object{{"max_letter_sheets", 0}}}}, "here");
    VlMail::Dispatch dispatch(presets, making, {settings, {0, [](long long) { return 0LL; }}},
                              VlMail::mailingsIntoFolder(folder), terminal);
    dispatch.take(std::move(result));
    dispatch.finish();
    dispatch.print();
    require(out.flush() && !text.str().empty());
    lookAtMailings(folder, pages);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static auto const silent = Log::setSink({});
    static Cfg::Presets const presets = settings().presets();
    static VlMail::PresetIndex const index(presets);
    fs::path const folder = privateFolder() / "mailings";
    mail(
        VlMail::readDocument(written(data, size), index, settings(), {.pages = VlMail::Along::Pages::Yes}, 1),
        presets, folder);
    fs::remove_all(folder);
    return 0;
}
