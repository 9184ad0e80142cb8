#include "programs/vlserviced/store/letter_register.h"

#include "programs/base/base64.h"
#include "programs/base/hex.h"
#include "programs/channel/token.h"

#include <algorithm>
#include <cstddef>
#include <map>
#include <set>

namespace VlServiced {
namespace {

/// Rows of one statement.
constexpr std::size_t AT_ONCE = 100;
/// Others wait meanwhile.
constexpr int REMOVED_AT_ONCE = 1000;
/// Of a letter that is sent for the first time, and as if it were.
constexpr long long FIRST_TURN = 0;

std::string secretIn(Database::Connection& database) {
    Database::Rows rows = database.query("SELECT secret FROM register_secret");
    return rows.next() ? rows.text(0) : std::string();
}

std::string secretOf(Database::Connection& database) {
    std::string secret = secretIn(database);
    if (!secret.empty())
        return secret;
    // Another service may be quicker.
    database.change("INSERT INTO register_secret (one, secret) VALUES (1, $1) ON CONFLICT DO NOTHING",
                    Channel::makeNonce());
    return secretIn(database);
}

std::string placeholder(std::size_t number) { return '$' + std::to_string(number); }

/// A statement's one column.
std::set<std::string> lettersIn(Database::Rows rows) {
    std::set<std::string> letters;
    while (rows.next())
        letters.insert(rows.text(0));
    return letters;
}

} // namespace

long long registeredLetters(Database::Connection& database, long long now) {
    return database.number("SELECT count(*) FROM registered_letters WHERE is_free = 0 AND ends_at > $1", now);
}

LetterRegister::LetterRegister(Database::Connection& database)
    : database_(database), secret_(Base::fromHex(secretOf(database)).value_or("")) {}

std::string LetterRegister::keyOf(std::string const& digest) const {
    return Base::toBase64(secret_.codeOf(Base::fromHex(digest).value_or(digest)));
}

/// A pack whose job is forgotten may be sent once more.
long long LetterRegister::mailingId(RegisteredMailing const& mailing) {
    Database::Rows rows = database_.query(
        "INSERT INTO registered_mailings (pack, node, at, ends_at) VALUES ($1, $2, $3, $4) ON CONFLICT "
        "(pack) "
        "DO UPDATE SET node = excluded.node, at = excluded.at, ends_at = excluded.ends_at RETURNING id",
        mailing.pack, mailing.node, mailing.at, mailing.endsAt);
    rows.next();
    long long const id = rows.number(0);
    rows.next();
    return id;
}

std::set<std::string> LetterRegister::insert(Keys const& keys, RegisteredMailing const& mailing, long long id,
                                             long long turn) {
    constexpr std::size_t COMMON = 4;
    Database::Values values{id, mailing.endsAt, mailing.at, turn};
    std::string rows;
    for (std::size_t i = 0; i < keys.size(); ++i) {
        values.emplace_back(keys[i].first);
        values.emplace_back(keys[i].second);
        std::size_t const at = COMMON + 2 * i;
        rows += (rows.empty() ? "(" : ", (") + placeholder(at + 1) + ", $4, $1, " + placeholder(at + 2) +
                ", $2, 0)";
    }
    return lettersIn(database_.queryAll(
        "INSERT INTO registered_letters (letter, turn, mailing, number, ends_at, is_free) VALUES " + rows +
            " ON CONFLICT (letter, turn) DO UPDATE SET mailing = excluded.mailing, number = "
            "excluded.number, ends_at = excluded.ends_at, is_free = 0 WHERE registered_letters.is_free = 1 "
            "OR registered_letters.ends_at <= $3 RETURNING letter",
        values));
}

std::set<std::string> LetterRegister::sentAgain(Keys const& keys, long long now) const {
    // Where nobody has sent any again there is nothing to look for.
    if (!database_.query("SELECT 1 FROM registered_letters WHERE turn > 0 LIMIT 1").next())
        return {};
    Database::Values values{now};
    std::string letters;
    for (auto const& [letter, number] : keys) {
        values.emplace_back(letter);
        letters += (letters.empty() ? "" : ", ") + placeholder(values.size());
    }
    return lettersIn(database_.queryAll("SELECT letter FROM registered_letters WHERE letter IN (" + letters +
                                            ") AND turn > 0 AND is_free = 0 AND ends_at > $1",
                                        values));
}

void LetterRegister::enterOnce(Keys const& keys, RegisteredMailing const& mailing, long long id,
                               std::set<long long>& refused) {
    std::set<std::string> const entered = insert(keys, mailing, id, FIRST_TURN);
    std::set<std::string> const again = sentAgain(keys, mailing.at);
    for (auto const& [letter, number] : keys)
        if (!entered.contains(letter) || again.contains(letter))
            refused.insert(number);
}

void LetterRegister::enterAgain(Keys keys, RegisteredMailing const& mailing, long long id) {
    std::set<std::string> const entered = insert(keys, mailing, id, FIRST_TURN);
    std::erase_if(keys, [&](auto const& key) { return entered.contains(key.first); });
    if (!keys.empty())
        insert(keys, mailing, id, id);
}

std::vector<long long> LetterRegister::enter(RegisteredMailing const& mailing,
                                             std::vector<Mailing::LetterDigest> const& letters, Known known) {
    std::set<long long> refused;
    std::map<std::string, long long> byKey;
    for (Mailing::LetterDigest const& letter : letters)
        if (!byKey.emplace(keyOf(letter.digest), letter.number).second && known == Known::Refused)
            refused.insert(letter.number);
    // In the order of their keys, so that two services never wait for one another.
    Keys const keys(byKey.begin(), byKey.end());
    long long const id = mailingId(mailing);
    for (auto from = keys.begin(); from != keys.end();) {
        auto const to = from + std::min<std::ptrdiff_t>(AT_ONCE, keys.end() - from);
        Keys const some(from, to);
        if (known == Known::SentAgain)
            enterAgain(some, mailing, id);
        else
            enterOnce(some, mailing, id, refused);
        from = to;
    }
    return {refused.begin(), refused.end()};
}

std::vector<RegisteredLetter> LetterRegister::find(std::vector<std::string> const& digests,
                                                   long long now) const {
    std::vector<RegisteredLetter> found;
    for (std::string const& digest : digests) {
        std::string const key = keyOf(digest);
        Database::Rows rows =
            database_.query("SELECT m.pack, m.node, m.at, l.ends_at, l.number FROM registered_letters l "
                            "JOIN registered_mailings m ON m.id = l.mailing "
                            "WHERE l.letter = $1 AND l.is_free = 0 AND l.ends_at > $2 "
                            "ORDER BY m.at DESC, m.id DESC LIMIT 1",
                            key, now);
        if (rows.next())
            found.push_back(
                {digest, {rows.text(0), rows.text(1), rows.number(2), rows.number(3)}, rows.number(4)});
    }
    return found;
}

bool LetterRegister::removeSome(long long now) {
    Database::Rows past = database_.query(
        "SELECT id FROM registered_mailings WHERE ends_at <= $1 ORDER BY ends_at LIMIT 1", now);
    if (!past.next())
        return false;
    long long const id = past.number(0);
    past.next();
    Database::Transaction transaction(database_);
    if (database_.change("DELETE FROM registered_letters WHERE mailing = $1 AND letter IN (SELECT letter "
                         "FROM registered_letters WHERE mailing = $1 LIMIT " +
                             std::to_string(REMOVED_AT_ONCE) + ")",
                         id) == 0)
        database_.change("DELETE FROM registered_mailings WHERE id = $1", id);
    transaction.commit();
    return true;
}

bool LetterRegister::hasItsSecret() const {
    std::string const anyDigest;
    return Channel::hmac(Base::fromHex(secretIn(database_)).value_or(""), anyDigest) ==
           secret_.codeOf(anyDigest);
}

std::optional<long long> LetterRegister::nextEnd() const {
    Database::Rows next = database_.query("SELECT ends_at FROM registered_mailings ORDER BY ends_at LIMIT 1");
    return next.next() ? std::optional(next.number(0)) : std::nullopt;
}

} // namespace VlServiced
