#include "programs/vlserviced/store/letter_store.h"

#include "programs/base/error.h"
#include "programs/protocol/carrier.h"

#include <charconv>
#include <iterator>
#include <sstream>
#include <system_error>

namespace VlServiced {
namespace {

using Protocol::letterStateName;
using Protocol::letterStateNamed;

constexpr char const* SELECT_LETTERS =
    "SELECT pack, number, channel, by_carrier, state, says, changed_at, attempts, first_try, "
    "due, notice_of, recipient, reply_to, reference, other_ways, tried FROM letters ";
/// As the index has it that holds those alone.
constexpr char const* TO_GO = "state = 'waiting' AND by_carrier = 1 ";

/// What was tried by a channel before goes without the others of its mailing.
constexpr char const* WITHOUT_OTHERS = ", tried = CASE WHEN tried = '' THEN channel ELSE tried END";

/// Names of channels have no blanks.
std::vector<std::string> namesIn(std::string const& text) {
    std::istringstream words(text);
    return {std::istream_iterator<std::string>(words), {}};
}

/// A channel that the letter has no address of has "-" in front.
Mailing::OtherWay wayIn(std::string const& text) {
    bool const hasAddress = !text.starts_with('-');
    return {hasAddress ? text : text.substr(1), hasAddress};
}

std::string textOf(std::vector<Mailing::OtherWay> const& ways) {
    std::string text;
    for (Mailing::OtherWay const& way : ways)
        text += (text.empty() ? "" : " ") + std::string(way.hasAddress ? "" : "-") + way.channel;
    return text;
}

StoredLetter letterIn(Database::Rows const& row) {
    StoredLetter letter;
    letter.id = {row.text(0), row.number(1)};
    letter.channel = row.text(2);
    letter.byCarrier = row.isTrue(3);
    letter.state = letterStateNamed(row.text(4));
    letter.says = row.text(5);
    letter.changedAt = row.number(6);
    letter.attempts = row.number(7);
    letter.firstTry = row.number(8);
    letter.due = row.number(9);
    letter.notice = {row.number(10), row.text(11), row.text(12), row.text(13)};
    for (std::string const& way : namesIn(row.text(14)))
        letter.otherWays.push_back(wayIn(way));
    letter.tried = namesIn(row.text(15));
    return letter;
}

std::vector<StoredLetter> lettersIn(Database::Rows rows) {
    std::vector<StoredLetter> letters;
    while (rows.next())
        letters.push_back(letterIn(rows));
    return letters;
}

std::optional<StoredLetter> firstLetterIn(Database::Rows rows) {
    return rows.next() ? std::optional(letterIn(rows)) : std::nullopt;
}

std::string conditionOf(LettersAre are) {
    switch (are) {
    case LettersAre::Waiting:
        return " AND state = 'waiting'";
    case LettersAre::HandedOver:
        return " AND state IN ('handed over', 'uncertain')";
    case LettersAre::Anywhere:
        break;
    }
    return "";
}

/// Whether notices of a letter in that state go out.
bool isTaken(LetterState state) { return state == LetterState::Accepted || state == LetterState::Delivered; }

LettersByCarriers shareOf(std::vector<DividedLetter> const& letters) {
    std::size_t byCarrier = 0;
    for (DividedLetter const& letter : letters)
        byCarrier += letter.byCarrier ? 1 : 0;
    if (byCarrier == 0)
        return LettersByCarriers::None;
    return byCarrier == letters.size() ? LettersByCarriers::All : LettersByCarriers::Some;
}

} // namespace

std::optional<LetterId> LetterId::ofKey(std::string_view key) {
    std::size_t const dash = key.rfind('-');
    if (dash == key.npos)
        return std::nullopt;
    LetterId letter{std::string(key.substr(0, dash))};
    bool const isNotice = key.substr(dash + 1).starts_with('n');
    auto const [end, failure] =
        std::from_chars(key.data() + dash + (isNotice ? 2 : 1), key.data() + key.size(), letter.number);
    if (failure != std::errc() || end != key.data() + key.size() || letter.number <= 0)
        return std::nullopt;
    letter.number = isNotice ? -letter.number : letter.number;
    return letter;
}

bool LetterStore::divide(JobKey const& job, std::vector<DividedLetter> const& letters, long long now,
                         std::vector<Notice> const& notices) {
    Database::Transaction transaction(database_);
    if (!jobs_.divide(job, shareOf(letters), now))
        return false;
    for (DividedLetter const& letter : letters)
        database_.change("INSERT INTO letters (pack, number, channel, by_carrier, state, changed_at, "
                         "other_ways) VALUES ($1, $2, $3, $4, $5, $6, $7)",
                         job.packId, letter.number, letter.channel, letter.byCarrier,
                         letterStateName(LetterState::Waiting), now, textOf(letter.otherWays));
    addNotices(job.packId, notices, now);
    transaction.commit();
    return true;
}

void LetterStore::addNotices(std::string const& packId, std::vector<Notice> const& notices, long long now) {
    long long number = 0;
    for (Notice const& notice : notices)
        database_.change("INSERT INTO letters (pack, number, channel, by_carrier, state, changed_at, "
                         "notice_of, recipient, reply_to, reference) "
                         "VALUES ($1, $2, $3, 1, 'held', $4, $5, $6, $7, $8)",
                         packId, --number, Protocol::NOTICE_CHANNEL, now, notice.letter, notice.recipient,
                         notice.replyTo, notice.reference);
}

std::optional<StoredLetter> LetterStore::find(LetterId const& letter) const {
    return firstLetterIn(database_.query(std::string(SELECT_LETTERS) + "WHERE pack = $1 AND number = $2",
                                         letter.packId, letter.number));
}

std::vector<StoredLetter> LetterStore::ofJob(std::string const& packId, std::size_t limit) const {
    return lettersIn(database_.query(std::string(SELECT_LETTERS) +
                                         "WHERE pack = $1 AND number > 0 ORDER BY number LIMIT " +
                                         std::to_string(limit),
                                     packId));
}

long long LetterStore::countOfJob(std::string const& packId) const {
    return database_.number("SELECT count(*) FROM letters WHERE pack = $1 AND number > 0", packId);
}

std::vector<StoredLetter> LetterStore::noticesOf(std::string const& packId, std::size_t limit) const {
    return lettersIn(database_.query(std::string(SELECT_LETTERS) +
                                         "WHERE pack = $1 AND number < 0 ORDER BY number DESC LIMIT " +
                                         std::to_string(limit),
                                     packId));
}

long long LetterStore::countOfNotices(std::string const& packId) const {
    return database_.number("SELECT count(*) FROM letters WHERE pack = $1 AND number < 0", packId);
}

std::vector<LetterShare> LetterStore::sharesOf(std::string const& packId) const {
    Database::Rows rows = database_.query("SELECT channel, by_carrier, state, count(*) FROM letters WHERE "
                                          "pack = $1 AND number > 0 GROUP BY channel, by_carrier, state "
                                          "ORDER BY channel, by_carrier, state",
                                          packId);
    std::vector<LetterShare> shares;
    while (rows.next())
        shares.push_back({rows.text(0), rows.isTrue(1), letterStateNamed(rows.text(2)), rows.number(3)});
    return shares;
}

std::vector<StoredLetter> LetterStore::toGo(std::string const& channel, long long now,
                                            std::size_t limit) const {
    return lettersIn(database_.query(SELECT_LETTERS + database_.by("letters_to_go") +
                                         "WHERE channel = $1 AND due <= $2 AND " + TO_GO +
                                         "ORDER BY due, id LIMIT " + std::to_string(limit),
                                     channel, now));
}

std::vector<StoredLetter> LetterStore::toGoTogether(std::string const& packId, std::string const& channel,
                                                    long long now) const {
    return lettersIn(database_.query(
        SELECT_LETTERS + database_.by("letters_by_state") +
            "WHERE pack = $1 AND channel = $2 AND due <= $3 AND number > 0 AND tried = '' AND " + TO_GO +
            "ORDER BY number",
        packId, channel, now));
}

std::vector<std::string> LetterStore::channelsToGo() const {
    Database::Rows rows =
        database_.query("SELECT DISTINCT channel FROM letters " + database_.by("letters_to_go") + "WHERE " +
                        TO_GO + "ORDER BY channel");
    std::vector<std::string> channels;
    while (rows.next())
        channels.push_back(rows.text(0));
    return channels;
}

long long LetterStore::waiting(std::string const& channel) const {
    return database_.number(std::string("SELECT count(*) FROM letters WHERE channel = $1 AND ") + TO_GO,
                            channel);
}

long long LetterStore::uncertain(std::string const& channel) const {
    return database_.number("SELECT count(*) FROM letters WHERE channel = $1 AND state = 'uncertain'",
                            channel);
}

std::set<std::string> LetterStore::channelsByCarrier(std::string const& packId) const {
    Database::Rows rows =
        database_.query("SELECT DISTINCT channel FROM letters WHERE pack = $1 AND number > 0 AND "
                        "by_carrier = 1",
                        packId);
    std::set<std::string> channels;
    while (rows.next())
        channels.insert(rows.text(0));
    return channels;
}

LetterCounts LetterStore::counts(std::string const& packId) const {
    Database::Rows rows = database_.query("SELECT state, count(*) FROM letters WHERE pack = $1 AND "
                                          "number > 0 AND by_carrier = 1 GROUP BY state",
                                          packId);
    LetterCounts counts;
    while (rows.next())
        counts[letterStateNamed(rows.text(0))] = rows.number(1);
    return counts;
}

bool LetterStore::isUnderWay(std::string const& packId) const {
    return firstIn(packId, LetterState::Waiting) || firstIn(packId, LetterState::HandedOver);
}

std::optional<StoredLetter> LetterStore::firstIn(std::string const& packId, LetterState state) const {
    return firstLetterIn(database_.query(SELECT_LETTERS + database_.by("letters_by_state") +
                                             "WHERE pack = $1 AND state = $2 AND by_carrier = 1 AND "
                                             "number > 0 ORDER BY number LIMIT 1",
                                         packId, letterStateName(state)));
}

void LetterStore::beginHandingOver(std::vector<LetterId> const& letters, long long now) {
    Database::Transaction transaction(database_);
    for (LetterId const& letter : letters)
        if (database_.change("UPDATE letters SET state = 'handed over', says = '', changed_at = $1 "
                             "WHERE pack = $2 AND number = $3 AND state = 'waiting'",
                             now, letter.packId, letter.number) == 0)
            throw Base::Error(Base::Code::LeaseLost,
                              "another service may have handed over letter " + letter.key());
    transaction.commit();
}

bool LetterStore::holdChannel(std::string const& channel, std::string const& says, long long now) {
    if (!isShared())
        return true;
    Database::Transaction transaction(database_);
    Database::Rows former =
        database_.query("SELECT holder FROM carriers WHERE channel = $1 FOR UPDATE", channel);
    bool const isMine = former.next() && former.text(0) == jobs_.holder().name;
    if (database_.change(
            "INSERT INTO carriers (channel, paused, failures, says, since, try_at, holder, fence, "
            "held_until) "
            "VALUES ($1, 0, 0, '', 0, 0, $2, 1, clock_ms() + $3) ON CONFLICT (channel) DO UPDATE SET "
            "fence = carriers.fence + 1, holder = excluded.holder, held_until = excluded.held_until "
            "WHERE carriers.holder = excluded.holder OR carriers.held_until <= clock_ms()",
            channel, jobs_.holder().name, jobs_.holder().seconds * 1000) == 0)
        return false;
    if (!isMine)
        database_.change("UPDATE letters SET state = 'uncertain', says = $1, changed_at = $2 WHERE "
                         "channel = $3 AND state = 'handed over' AND by_carrier = 1",
                         says, now, channel);
    transaction.commit();
    return true;
}

std::vector<std::string> LetterStore::channelsLeft() const {
    if (!isShared())
        return {};
    Database::Rows rows = database_.query(
        "SELECT DISTINCT l.channel FROM letters l LEFT JOIN carriers c ON c.channel = l.channel WHERE "
        "l.state = 'handed over' AND l.by_carrier = 1 AND "
        "(c.channel IS NULL OR (c.holder <> $1 AND c.held_until <= clock_ms())) ORDER BY l.channel",
        jobs_.holder().name);
    std::vector<std::string> channels;
    while (rows.next())
        channels.push_back(rows.text(0));
    return channels;
}

void LetterStore::finish(std::vector<LetterId> const& letters, LetterState state, std::string const& says,
                         long long now, LettersAre are) {
    Database::Transaction transaction(database_);
    for (LetterId const& letter : letters)
        if (database_.change("UPDATE letters SET state = $1, says = $2, changed_at = $3 "
                             "WHERE pack = $4 AND number = $5" +
                                 conditionOf(are),
                             letterStateName(state), says, now, letter.packId, letter.number) == 1 &&
            isTaken(state))
            releaseNoticesOf(letter, now);
    transaction.commit();
}

void LetterStore::releaseNoticesOf(LetterId const& letter, long long now) {
    database_.change("UPDATE letters SET state = 'waiting', changed_at = $1 WHERE pack = $2 AND "
                     "notice_of = $3 AND state = 'held'",
                     now, letter.packId, letter.number);
}

void LetterStore::releaseNoticeOfJob(std::string const& packId, long long now) {
    releaseNoticesOf({packId, 0}, now);
}

void LetterStore::releaseNoticesOfContainer(std::string const& packId, long long now) {
    database_.change("UPDATE letters SET state = 'waiting', changed_at = $1 WHERE pack = $2 AND "
                     "notice_of > 0 AND state = 'held' AND notice_of NOT IN (SELECT number FROM letters "
                     "WHERE pack = $2 AND number > 0 AND by_carrier = 1)",
                     now, packId);
}

void LetterStore::postpone(std::vector<LetterId> const& letters, std::string const& says, long long due,
                           long long now, LettersAre are) {
    Database::Transaction transaction(database_);
    for (LetterId const& letter : letters)
        database_.change(
            "UPDATE letters SET state = 'waiting', says = $1, due = $2, attempts = attempts + 1, "
            "first_try = CASE WHEN first_try = 0 THEN $3 ELSE first_try END, changed_at = $3 "
            "WHERE pack = $4 AND number = $5" +
                conditionOf(are),
            says, due, now, letter.packId, letter.number);
    transaction.commit();
}

void LetterStore::fallBack(LetterId const& letter, std::string const& channel,
                           std::vector<Mailing::OtherWay> const& left, std::string const& says, long long now,
                           LettersAre are) {
    database_.change("UPDATE letters SET tried = CASE WHEN tried = '' OR tried = channel THEN channel ELSE "
                     "tried || ' ' || "
                     "channel END, "
                     "channel = $1, other_ways = $2, state = 'waiting', says = $3, changed_at = $4, due = 0, "
                     "attempts = 0, first_try = 0 WHERE pack = $5 AND number = $6" +
                         conditionOf(are),
                     channel, textOf(left), says, now, letter.packId, letter.number);
}

void LetterStore::holdBack(std::string const& packId, std::string const& channel, long long due) {
    database_.change("UPDATE letters SET due = $1 WHERE pack = $2 AND channel = $3 AND due < $1 AND " +
                         std::string(TO_GO),
                     due, packId, channel);
}

std::vector<StoredLetter> LetterStore::withOtherSide(std::string const& channel, long long since) const {
    return lettersIn(database_.query(
        std::string(SELECT_LETTERS) +
            "WHERE channel = $1 AND by_carrier = 1 AND state IN ('accepted', 'uncertain') AND "
            "changed_at >= $2 ORDER BY id",
        channel, since));
}

bool LetterStore::decide(LetterId const& letter, std::vector<LetterState> const& from, LetterState to,
                         std::string const& says, long long now, Goes goes) {
    std::string states;
    for (LetterState const state : from)
        states += (states.empty() ? "'" : ", '") + std::string(letterStateName(state)) + '\'';
    Database::Transaction transaction(database_);
    bool const isDecided =
        database_.change("UPDATE letters SET state = $1, says = $2, changed_at = $3, due = 0, "
                         "attempts = 0, first_try = 0" +
                             std::string(goes == Goes::Alone ? WITHOUT_OTHERS : "") +
                             " WHERE pack = $4 AND number = $5 AND by_carrier = 1 AND state IN (" + states +
                             ')',
                         letterStateName(to), says, now, letter.packId, letter.number) == 1;
    if (isDecided && isTaken(to))
        releaseNoticesOf(letter, now);
    transaction.commit();
    return isDecided;
}

long long LetterStore::doubtAll(std::string const& says, long long now) {
    Database::Transaction transaction(database_);
    constexpr char const* DOUBTED =
        "UPDATE letters SET state = 'uncertain', says = $1, changed_at = $2 WHERE "
        "by_carrier = 1 AND state IN ('waiting', 'handed over', 'held') AND number ";
    long long const letters = database_.change(std::string(DOUBTED) + "> 0", says, now);
    // Those that are held may have gone meanwhile.
    database_.change(std::string(DOUBTED) + "< 0", says, now);
    transaction.commit();
    return letters;
}

void LetterStore::doubt(std::string const& says, long long now) {
    database_.change(
        "UPDATE letters SET state = 'uncertain', says = $1, changed_at = $2 WHERE state = 'handed over'",
        says, now);
}

CarrierRecord LetterStore::carrier(std::string const& channel) const {
    Database::Rows rows = database_.query(
        "SELECT paused, failures, says, since, try_at FROM carriers WHERE channel = $1", channel);
    if (!rows.next())
        return {};
    return {rows.isTrue(0), rows.number(1), rows.text(2), rows.number(3), rows.number(4)};
}

void LetterStore::setCarrier(std::string const& channel, CarrierRecord const& record) {
    database_.change("INSERT INTO carriers (channel, paused, failures, says, since, try_at) "
                     "VALUES ($1, $2, $3, $4, $5, $6) ON CONFLICT (channel) DO UPDATE SET "
                     "paused = excluded.paused, failures = excluded.failures, says = excluded.says, "
                     "since = excluded.since, try_at = excluded.try_at",
                     channel, record.isPaused, record.failures, record.says, record.since, record.tryAt);
}

} // namespace VlServiced
