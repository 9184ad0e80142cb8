#pragma once
// Packs as clients send them over the connection, for short tests.

#include "programs/channel/data_message.h"
#include "programs/mailing/pack_digest.h"
#include "programs/protocol/pack_upload.h"
#include "tests/vlserviced/pack_help.h"

#include <algorithm>
#include <string>
#include <vector>

/// The pack of storePack(), page by page.
class SentPack {
public:
    struct Page {
        std::string document;
        std::string page;
        std::string blob;
    };

    explicit SentPack(std::string id, std::string cfgId = "a=acme", std::string const& preset = "") {
        head.id = std::move(id);
        head.cfgId = std::move(cfgId);
        head.title = "Title of " + head.id;
        add("one.pdf", "1", "first page of " + head.id);
        add("one.pdf", "2", "second page of " + head.id);
        add("two.pdf", "1", "third page of " + head.id);
        add("", "", metadataText(head.id, preset));
        settle();
    }

    void add(std::string document, std::string page, std::string const& text) {
        SharedMemBuffer const blob = zipped(text);
        pages.push_back({std::move(document), std::move(page),
                         std::string(reinterpret_cast<char const*>(blob.data()), blob.size())});
    }
    /// Says of the pages what they are.
    void settle() {
        Mailing::PackDigest digest;
        head.pages = static_cast<long long>(pages.size()) - 1;
        head.bytes = 0;
        for (Page const& page : pages) {
            digest.add(page.document, page.page, static_cast<long long>(page.blob.size()),
                       Base::sha256(page.blob));
            head.bytes += static_cast<long long>(page.blob.size());
        }
        head.sha256 = digest.text();
    }
    /// The text of a data message with a page, or with so many bytes of it.
    std::string text(std::size_t position, std::size_t offset = 0,
                     std::size_t length = std::string::npos) const {
        Page const& page = pages.at(position);
        return Channel::printData(
            {head.id, static_cast<std::uint32_t>(position), page.document, page.page, page.blob.size(),
             offset, std::string_view(page.blob).substr(offset, std::min(length, Channel::MAX_PIECE))});
    }

    Protocol::BeginPack head;
    /// The metadata is the last.
    std::vector<Page> pages;
};
