#include "programs/vlserviced/store/letter_store.h"

#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>

namespace VlServiced {
namespace {

using Protocol::letterStateName;
using Protocol::letterStateNamed;

constexpr char const* SELECT_LETTERS =
    "SELECT pack, number, channel, by_carrier, state, says, changed_at, attempts, first_try, "
    "due FROM letters ";
/// As the index has it that holds those alone.
constexpr char const* TO_GO = "state = 'waiting' AND by_carrier = 1 ";

StoredLetter letterIn(SQLite::Statement& row) {
    StoredLetter letter;
    letter.id = {row.getColumn(0).getString(), row.getColumn(1).getInt64()};
    letter.channel = row.getColumn(2).getString();
    letter.byCarrier = row.getColumn(3).getInt() != 0;
    letter.state = letterStateNamed(row.getColumn(4).getString());
    letter.says = row.getColumn(5).getString();
    letter.changedAt = row.getColumn(6).getInt64();
    letter.attempts = row.getColumn(7).getInt64();
    letter.firstTry = row.getColumn(8).getInt64();
    letter.due = row.getColumn(9).getInt64();
    return letter;
}

std::vector<StoredLetter> lettersIn(SQLite::Statement& query) {
    std::vector<StoredLetter> letters;
    while (query.executeStep())
        letters.push_back(letterIn(query));
    return letters;
}

std::optional<StoredLetter> firstLetterIn(SQLite::Statement& query) {
    if (!query.executeStep())
        return std::nullopt;
    return letterIn(query);
}

long long countIn(SQLite::Statement& query) {
    return query.executeStep() ? query.getColumn(0).getInt64() : 0;
}

void bind(SQLite::Statement& statement, int at, long long number) {
    statement.bind(at, static_cast<std::int64_t>(number));
}

/// Carries the statement out for each letter, whose mailing and number are its last two values.
void forEach(SQLite::Database& database, std::vector<LetterId> const& letters, SQLite::Statement& change,
             int packAt) {
    SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
    for (LetterId const& letter : letters) {
        change.bind(packAt, letter.packId);
        bind(change, packAt + 1, letter.number);
        change.exec();
        change.reset();
    }
    transaction.commit();
}

LettersByCarriers shareOf(std::vector<DividedLetter> const& letters) {
    std::size_t byCarrier = 0;
    for (DividedLetter const& letter : letters)
        byCarrier += letter.byCarrier ? 1 : 0;
    if (byCarrier == 0)
        return LettersByCarriers::None;
    return byCarrier == letters.size() ? LettersByCarriers::All : LettersByCarriers::Some;
}

} // namespace

bool LetterStore::divide(std::string const& packId, std::vector<DividedLetter> const& letters,
                         long long now) {
    SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
    if (!jobs_.divide(packId, shareOf(letters), now))
        return false;
    SQLite::Statement insertion(database_, "INSERT INTO letters (pack, number, channel, by_carrier, state, "
                                           "changed_at) VALUES (?, ?, ?, ?, ?, ?)");
    for (DividedLetter const& letter : letters) {
        insertion.bind(1, packId);
        bind(insertion, 2, letter.number);
        insertion.bind(3, letter.channel);
        insertion.bind(4, letter.byCarrier ? 1 : 0);
        insertion.bind(5, letterStateName(LetterState::Waiting));
        bind(insertion, 6, now);
        insertion.exec();
        insertion.reset();
    }
    transaction.commit();
    return true;
}

std::optional<StoredLetter> LetterStore::find(LetterId const& letter) const {
    SQLite::Statement query(database_, std::string(SELECT_LETTERS) + "WHERE pack = ? AND number = ?");
    query.bind(1, letter.packId);
    bind(query, 2, letter.number);
    return firstLetterIn(query);
}

std::vector<StoredLetter> LetterStore::ofJob(std::string const& packId, std::size_t limit) const {
    SQLite::Statement query(database_, std::string(SELECT_LETTERS) + "WHERE pack = ? ORDER BY number LIMIT " +
                                           std::to_string(limit));
    query.bind(1, packId);
    return lettersIn(query);
}

long long LetterStore::countOfJob(std::string const& packId) const {
    SQLite::Statement query(database_, "SELECT count(*) FROM letters WHERE pack = ?");
    query.bind(1, packId);
    return countIn(query);
}

std::vector<StoredLetter> LetterStore::toGo(std::string const& channel, long long now,
                                            std::size_t limit) const {
    SQLite::Statement query(database_, std::string(SELECT_LETTERS) +
                                           "INDEXED BY letters_to_go WHERE channel = ? AND due <= ? AND " +
                                           TO_GO + "ORDER BY due, id LIMIT " + std::to_string(limit));
    query.bind(1, channel);
    bind(query, 2, now);
    return lettersIn(query);
}

std::vector<StoredLetter> LetterStore::toGoTogether(std::string const& packId, std::string const& channel,
                                                    long long now) const {
    SQLite::Statement query(database_, std::string(SELECT_LETTERS) +
                                           "INDEXED BY letters_by_state WHERE pack = ? AND channel = ? AND "
                                           "due <= ? AND " +
                                           TO_GO + "ORDER BY number");
    query.bind(1, packId);
    query.bind(2, channel);
    bind(query, 3, now);
    return lettersIn(query);
}

std::vector<std::string> LetterStore::channelsToGo() const {
    SQLite::Statement query(database_, std::string("SELECT DISTINCT channel FROM letters INDEXED BY "
                                                   "letters_to_go WHERE ") +
                                           TO_GO + "ORDER BY channel");
    std::vector<std::string> channels;
    while (query.executeStep())
        channels.push_back(query.getColumn(0).getString());
    return channels;
}

long long LetterStore::waiting(std::string const& channel) const {
    SQLite::Statement query(database_,
                            std::string("SELECT count(*) FROM letters WHERE channel = ? AND ") + TO_GO);
    query.bind(1, channel);
    return countIn(query);
}

long long LetterStore::uncertain(std::string const& channel) const {
    SQLite::Statement query(database_,
                            "SELECT count(*) FROM letters WHERE channel = ? AND state = 'uncertain'");
    query.bind(1, channel);
    return countIn(query);
}

LetterCounts LetterStore::counts(std::string const& packId) const {
    SQLite::Statement query(database_, "SELECT state, count(*) FROM letters WHERE pack = ? AND "
                                       "by_carrier = 1 GROUP BY state");
    query.bind(1, packId);
    LetterCounts counts;
    while (query.executeStep())
        counts[letterStateNamed(query.getColumn(0).getString())] = query.getColumn(1).getInt64();
    return counts;
}

bool LetterStore::isUnderWay(std::string const& packId) const {
    return firstIn(packId, LetterState::Waiting) || firstIn(packId, LetterState::HandedOver);
}

std::optional<StoredLetter> LetterStore::firstIn(std::string const& packId, LetterState state) const {
    SQLite::Statement query(database_, std::string(SELECT_LETTERS) +
                                           "INDEXED BY letters_by_state WHERE pack = ? AND state = ? AND "
                                           "by_carrier = 1 ORDER BY number LIMIT 1");
    query.bind(1, packId);
    query.bind(2, letterStateName(state));
    return firstLetterIn(query);
}

void LetterStore::beginHandingOver(std::vector<LetterId> const& letters, long long now) {
    finish(letters, LetterState::HandedOver, {}, now);
}

void LetterStore::finish(std::vector<LetterId> const& letters, LetterState state, std::string const& says,
                         long long now) {
    SQLite::Statement change(database_, "UPDATE letters SET state = ?, says = ?, changed_at = ? "
                                        "WHERE pack = ? AND number = ?");
    change.bind(1, letterStateName(state));
    change.bind(2, says);
    bind(change, 3, now);
    forEach(database_, letters, change, 4);
}

void LetterStore::postpone(std::vector<LetterId> const& letters, std::string const& says, long long due,
                           long long now) {
    SQLite::Statement change(database_, "UPDATE letters SET state = 'waiting', says = ?1, due = ?2, "
                                        "attempts = attempts + 1, "
                                        "first_try = iif(first_try = 0, ?3, first_try), changed_at = ?3 "
                                        "WHERE pack = ?4 AND number = ?5");
    change.bind(1, says);
    bind(change, 2, due);
    bind(change, 3, now);
    forEach(database_, letters, change, 4);
}

bool LetterStore::decide(LetterId const& letter, std::vector<LetterState> const& from, LetterState to,
                         std::string const& says, long long now) {
    std::string states;
    for (LetterState const state : from)
        states += (states.empty() ? "'" : ", '") + std::string(letterStateName(state)) + '\'';
    SQLite::Statement change(database_, "UPDATE letters SET state = ?, says = ?, changed_at = ?, due = 0, "
                                        "attempts = 0, first_try = 0 WHERE pack = ? AND number = ? AND "
                                        "by_carrier = 1 AND state IN (" +
                                            states + ')');
    change.bind(1, letterStateName(to));
    change.bind(2, says);
    bind(change, 3, now);
    change.bind(4, letter.packId);
    bind(change, 5, letter.number);
    return change.exec() == 1;
}

void LetterStore::doubt(std::string const& says, long long now) {
    SQLite::Statement change(database_, "UPDATE letters SET state = 'uncertain', says = ?, changed_at = ? "
                                        "WHERE state = 'handed over'");
    change.bind(1, says);
    bind(change, 2, now);
    change.exec();
}

CarrierRecord LetterStore::carrier(std::string const& channel) const {
    SQLite::Statement query(database_,
                            "SELECT paused, failures, says, since, try_at FROM carriers WHERE channel = ?");
    query.bind(1, channel);
    if (!query.executeStep())
        return {};
    return {query.getColumn(0).getInt() != 0, query.getColumn(1).getInt64(), query.getColumn(2).getString(),
            query.getColumn(3).getInt64(), query.getColumn(4).getInt64()};
}

void LetterStore::setCarrier(std::string const& channel, CarrierRecord const& record) {
    SQLite::Statement change(database_, "INSERT OR REPLACE INTO carriers (channel, paused, failures, says, "
                                        "since, try_at) VALUES (?, ?, ?, ?, ?, ?)");
    change.bind(1, channel);
    change.bind(2, record.isPaused ? 1 : 0);
    bind(change, 3, record.failures);
    change.bind(4, record.says);
    bind(change, 5, record.since);
    bind(change, 6, record.tryAt);
    change.exec();
}

} // namespace VlServiced
