#pragma once
// The certificates that a person has accepted: which service had which fingerprint.

#include <optional>
#include <string>
#include <utility>

namespace Channel {

/// A private text file with one line a service: its host and port, a blank, the fingerprint; a line without a
/// whole fingerprint counts for nothing. Read anew for each question, so that a line may be removed by hand.
class PinStore {
public:
    /// The file need not exist yet.
    explicit PinStore(std::string file) : file_(std::move(file)) {}

    std::string const& file() const { return file_; }
    /// Throws Error when the file is not private or cannot be read.
    std::optional<std::string> find(std::string const& service) const;
    /// Throws Error when the file cannot be written.
    void add(std::string const& service, std::string const& fingerprint) const;

private:
    std::string file_;
};

} // namespace Channel
