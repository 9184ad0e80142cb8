#pragma once
// Packs in a pack database, and what became of them in a container, for short tests.

#include "programs/mailing/pack_database.h"
#include "tests/vlserviced/json_help.h"
#include "vlservice/pack/pack_wrapper.h"

#include <filesystem>
#include <string>

inline SharedMemBuffer zipped(std::string const& text) {
    return PageSaverI::zipDbData(text.data(), text.size());
}

inline std::string unzipped(SharedMemBuffer const& blob) {
    SharedMemBuffer const data = PageLoaderI::unzipDbData(blob);
    return data.empty() ? "" : std::string(reinterpret_cast<char const*>(data.data()), data.size());
}

/// The metadata of a pack as storePack() makes it: one letter of both documents. `preset` are members of its
/// pack preset, such as "\"process_mode\": 8, ".
inline std::string metadataText(std::string const& id, std::string const& preset = "") {
    return "{\"pack_preset\": \"Bills\", " + preset + "\"id\": \"" + id +
           R"(", "created": 1, "title": "metadata of )" + id +
           R"(", "letters": [{"documents": [{"name": "one.pdf", "pages": [1, 2]}, {"name": "two.pdf", "pages": [1]}], )" +
           R"("fields": []}]})";
}

/// Stores a pack of two documents with two pages and one page.
inline void storePack(std::filesystem::path const& file, std::string const& id,
                      std::string const& cfgId = "a=acme", std::string const& preset = "") {
    Mailing::PackDatabaseWriter writer(file, {id, cfgId, "Title of " + id});
    writer.savePage("one.pdf", "1", zipped("first page of " + id));
    writer.savePage("one.pdf", "2", zipped("second page of " + id));
    writer.savePage("two.pdf", "1", zipped("third page of " + id));
    writer.finish(zipped(metadataText(id, preset)));
}

/// What a container holds, as one text; it says so when something is wrong.
inline std::string contentOf(std::filesystem::path const& file) {
    if (!std::filesystem::exists(file))
        return "no container";
    PackWrapper container(file.string(), PackWrapper::PURPOSE_IMPORT, "");
    std::string content = container.packId() + ": ";
    for (auto const& [document, page] : {std::pair{"one.pdf", "1"}, {"one.pdf", "2"}, {"two.pdf", "1"}})
        container.requestPageData(document, page,
                                  [&](SharedMemBuffer const& blob) { content += unzipped(blob) + ", "; });
    return content + parse(unzipped(container.inputFullMeta())).get("title").textOrEmpty();
}

inline std::string contentOfPack(std::string const& id) {
    return id + ": first page of " + id + ", second page of " + id + ", third page of " + id +
           ", metadata of " + id;
}
