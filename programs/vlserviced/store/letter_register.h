#pragma once
// The register of letters that were accepted: it knows a letter again, and tells nothing of it.

#include "programs/channel/proof.h"
#include "programs/database/connection.h"
#include "programs/mailing/mailing_outline.h"

#include <cstddef>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace VlServiced {

/// A mailing whose letters are registered.
struct RegisteredMailing {
    std::string pack;
    std::string node;
    /// When it was accepted, and until when nobody sends one of its letters again; seconds since the epoch.
    long long at = 0;
    long long endsAt = 0;
};

/// A letter that is there.
struct RegisteredLetter {
    std::string digest;
    RegisteredMailing mailing;
    /// Of what it goes out in.
    long long number = 0;
};

/// How many letters would be known again at that time, each as often as it went out. Costs what the register
/// is large.
long long registeredLetters(Database::Connection& database, long long now);

/// A letter stands there under an HMAC-SHA-256 of its digest, by a secret that the database keeps. Letters
/// and mailings that fail or are called back free it, in the transaction that notes that.
class LetterRegister {
public:
    /// The database has to outlive it. Makes the secret, where there is none.
    explicit LetterRegister(Database::Connection& database);

    enum class Known { Refused, SentAgain };
    /// Enters the letters of a mailing within a transaction of the caller, who takes it back where any are
    /// refused: the numbers of those that are there already, or twice in the mailing, each once.
    std::vector<long long> enter(RegisteredMailing const& mailing,
                                 std::vector<Mailing::LetterDigest> const& letters, Known known);

    /// Those of the digests that are there at that time.
    std::vector<RegisteredLetter> find(std::vector<std::string> const& digests, long long now) const;

    /// Removes some of what is past; false when nothing is left.
    bool removeSome(long long now);

    /// Whether the database has the secret still that letters are entered and looked for by.
    bool hasItsSecret() const;
    /// When the next mailing's letters are past, or were; nothing when there is none.
    std::optional<long long> nextEnd() const;

private:
    /// Keys with their letters' numbers.
    using Keys = std::vector<std::pair<std::string, long long>>;

    std::string keyOf(std::string const& digest) const;
    long long mailingId(RegisteredMailing const& mailing);
    /// The letters that could be entered, of not too many.
    std::set<std::string> insert(Keys const& keys, RegisteredMailing const& mailing, long long id,
                                 long long turn);
    /// Those that a mailing has in which they were sent again.
    std::set<std::string> sentAgain(Keys const& keys, long long now) const;
    void enterOnce(Keys const& keys, RegisteredMailing const& mailing, long long id,
                   std::set<long long>& refused);
    void enterAgain(Keys keys, RegisteredMailing const& mailing, long long id);

    Database::Connection& database_;
    Channel::HmacKey secret_;
};

} // namespace VlServiced
