#include "programs/protocol/documents.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <algorithm>
#include <filesystem>
#include <utility>

namespace Protocol {
namespace {

struct DigestForm {
    static bool fits(json::Value const& node) {
        std::string const text = node.textOrEmpty();
        return text.size() == 64 && text.find_first_not_of("0123456789abcdef") == std::string::npos;
    }
    static std::string wanted() { return "64 hexadecimal digits"; }
};

/// Which of the names that an id without an ending may mean comes first.
bool comesBefore(StoredDocument const& a, StoredDocument const& b) {
    bool const isPdf = std::filesystem::path(a.name).extension() == ".pdf";
    return isPdf != (std::filesystem::path(b.name).extension() == ".pdf") ? isPdf : a.name < b.name;
}

using Documents = std::vector<StoredDocument>::const_iterator;

StoredDocument const* findAmong(Documents first, Documents last, std::string const& id) {
    auto const whole = std::find_if(first, last, [&](StoredDocument const& one) { return one.name == id; });
    if (whole != last)
        return &*whole;
    StoredDocument const* best = nullptr;
    for (; first != last; ++first)
        if (std::filesystem::path(first->name).stem() == id && (!best || comesBefore(*first, *best)))
            best = &*first;
    return best;
}

} // namespace

struct StoredDocument::Keys {
    static constexpr std::tuple TABLE{
        Always{"name", &StoredDocument::name},    Always{"node", &StoredDocument::node},
        Always{"bytes", &StoredDocument::bytes},  Always{"sha256", &StoredDocument::sha256},
        Always{"put_at", &StoredDocument::putAt},
    };
};

struct DocumentsAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"documents", &DocumentsAnswer::documents},
    };
};

struct DocumentPieceQuery::Keys {
    static constexpr std::tuple TABLE{
        Asked{"sha256", &DocumentPieceQuery::sha256, DigestForm{}},
        Asked{"offset", &DocumentPieceQuery::offset, IntegerForm{0, MAX_DOCUMENT_BYTES}},
    };
};

struct DocumentPiece::Keys {
    static constexpr std::tuple TABLE{
        Always{"data", &DocumentPiece::data},
    };
};

struct DocumentUpload::Keys {
    static constexpr std::tuple TABLE{
        Asked{"document", &DocumentUpload::name, TextForm{}},
        Asked{"sha256", &DocumentUpload::sha256, DigestForm{}},
        Asked{"bytes", &DocumentUpload::bytes, IntegerForm{}},
        Asked{"upload", &DocumentUpload::upload, IntegerForm{}},
        Asked{"offset", &DocumentUpload::offset, IntegerForm{}},
        Asked{"data", &DocumentUpload::data, TextForm{}},
    };
};

struct DocumentUploadAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"upload", &DocumentUploadAnswer::upload},
        Always{"complete", &DocumentUploadAnswer::complete},
    };
};

struct DocumentRemoval::Keys {
    static constexpr std::tuple TABLE{
        Asked{"document", &DocumentRemoval::document, TextForm{}},
    };
};

StoredDocument::StoredDocument(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object StoredDocument::serialize() const { return writeRecord(*this); }

DocumentsQuery::DocumentsQuery(std::string nodeId) : id(std::move(nodeId)) {}
DocumentsQuery::DocumentsQuery(json::Object const& object) : id(nodeIn(object, IN_WORDS)) {}

json::Object DocumentsQuery::serialize() const {
    json::Object object = question(KIND);
    object.set(NODE_ID, id);
    return object;
}

DocumentsAnswer::DocumentsAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object DocumentsAnswer::serialize() const { return writeRecord(*this); }

StoredDocument const* DocumentsAnswer::find(std::string const& documentId) const {
    for (auto first = documents.begin(); first != documents.end();) {
        auto const last = std::find_if(first, documents.end(),
                                       [&](StoredDocument const& one) { return one.node != first->node; });
        if (StoredDocument const* const found = findAmong(first, last, documentId))
            return found;
        first = last;
    }
    return nullptr;
}

DocumentPieceQuery::DocumentPieceQuery(std::string digest, long long at)
    : sha256(std::move(digest)), offset(at) {}
DocumentPieceQuery::DocumentPieceQuery(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
}

json::Object DocumentPieceQuery::serialize() const {
    json::Object object = question(KIND);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

DocumentPiece::DocumentPiece(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object DocumentPiece::serialize() const { return writeRecord(*this); }

DocumentUpload::DocumentUpload(json::Object const& object) : id(nodeIn(object, IN_WORDS)) {
    json::readKeys(Keys::TABLE, object, *this);
}

json::Object DocumentUpload::serialize() const {
    json::Object object = question(KIND);
    object.set(NODE_ID, id);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

DocumentUploadAnswer::DocumentUploadAnswer(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
}
json::Object DocumentUploadAnswer::serialize() const { return writeRecord(*this); }

DocumentRemoval::DocumentRemoval(std::string nodeId, std::string documentId)
    : id(std::move(nodeId)), document(std::move(documentId)) {}
DocumentRemoval::DocumentRemoval(json::Object const& object) : id(nodeIn(object, IN_WORDS)) {
    json::readKeys(Keys::TABLE, object, *this);
}

json::Object DocumentRemoval::serialize() const {
    json::Object object = question(KIND);
    object.set(NODE_ID, id);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

} // namespace Protocol
