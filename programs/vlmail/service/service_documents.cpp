#include "programs/vlmail/service/service_documents.h"

#include "programs/base/base64.h"
#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/vlmail/service/service_client.h"

#include <optional>

namespace VlMail {
namespace {

using Protocol::DocumentUpload;

[[noreturn]] void failFetching() {
    throw Base::Error(Base::Code::DocumentChanged,
                      "the service sent another document than was asked for; try again");
}

} // namespace

Protocol::DocumentsAnswer documentsOf(Channel::Client& service, std::string const& nodeId) {
    return Protocol::DocumentsAnswer(ask(service, Protocol::DocumentsQuery(nodeId)));
}

std::string fetchDocument(Channel::Client& service, std::string const& sha256) {
    std::string document;
    for (;;) {
        auto const at = static_cast<long long>(document.size());
        Protocol::DocumentPiece const answer(ask(service, Protocol::DocumentPieceQuery(sha256, at)));
        std::optional<std::string> const piece = Base::fromBase64(answer.data);
        if (!piece || static_cast<long long>(piece->size()) > Protocol::MAX_DOCUMENT_BYTES - at)
            failFetching();
        if (piece->empty())
            break;
        document += *piece;
    }
    if (Base::sha256(document) != sha256)
        failFetching();
    return document;
}

std::string putDocument(Channel::Client& service, std::string const& nodeId, std::string const& name,
                        std::string const& bytes) {
    DocumentUpload upload;
    upload.id = nodeId;
    upload.name = name;
    upload.sha256 = Base::sha256(bytes);
    upload.bytes = static_cast<long long>(bytes.size());
    do {
        std::string const piece =
            bytes.substr(static_cast<std::size_t>(upload.offset), Protocol::MAX_PIECE_BYTES);
        upload.data = Base::toBase64(piece);
        upload.upload = Protocol::DocumentUploadAnswer(ask(service, upload)).upload;
        upload.offset += static_cast<long long>(piece.size());
    } while (upload.offset < upload.bytes);
    return upload.sha256;
}

Protocol::StoredDocument removeDocument(Channel::Client& service, Protocol::DocumentRemoval const& removal) {
    return Protocol::StoredDocument(ask(service, removal));
}

} // namespace VlMail
