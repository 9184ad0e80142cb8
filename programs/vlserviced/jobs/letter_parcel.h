#pragma once
// Letters out of a mailing in the outbox, made up as a carrier takes them.

#include "programs/carriers/carrier.h"
#include "programs/vlserviced/store/letter_store.h"

#include <filesystem>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace VlServiced {

class OutboxMailing;

/// A letter that can never go out, and why.
struct BadLetter {
    LetterId id;
    std::string why;
};

struct MadeParcel {
    /// Without letters when all of them are bad.
    Carriers::Parcel parcel;
    std::vector<BadLetter> bad;
};

/// The letters of one mailing. Several threads may ask at once; the container is opened when the first does.
class LetterSource {
public:
    LetterSource(std::filesystem::path const& outbox, std::string packId);
    ~LetterSource();

    static std::filesystem::path container(std::filesystem::path const& outbox, std::string const& packId) {
        return outbox / (packId + ".mailing");
    }

    std::string const& packId() const { return packId_; }

    /// Where a letter's attachments go.
    enum class Attachments {
        /// Among its pages, as they are printed.
        Printed,
        /// As files of their own; sides that only a print has are left out.
        Apart,
    };

    /// These letters, which are of this mailing, as one parcel of that key: their pages one letter after
    /// another, each on a sheet of its own. Throws std::exception when the container cannot be read.
    MadeParcel parcelOf(std::vector<StoredLetter> const& letters, std::string const& key,
                        Attachments attachments = Attachments::Printed);

private:
    OutboxMailing& opened();

    std::string packId_;
    std::filesystem::path container_;
    std::mutex mutex_;
    std::unique_ptr<OutboxMailing> mailing_;
};

} // namespace VlServiced
