#pragma once
// Letters on their way, as client and service speak of them: their states, and what a person decides of them.

#include "vlservice/json/json.h"

#include <array>
#include <string>
#include <utility>
#include <vector>

namespace Protocol {

/// The way of one letter of a mailing that is handed over.
enum class LetterState {
    /// Nobody has it yet.
    Waiting,
    /// It is at the point from which the other side may have it.
    HandedOver,
    /// The other side has taken it on.
    Accepted,
    /// It has reached its recipient.
    Delivered,
    /// It came back.
    Returned,
    /// Refused, or given up.
    Failed,
    /// The other side may have it or not; a person has to find out.
    Uncertain,
    /// A notice alone: what it tells of has not happened yet.
    Held,
};

inline constexpr std::array ALL_LETTER_STATES{
    LetterState::Waiting,  LetterState::HandedOver, LetterState::Accepted,  LetterState::Delivered,
    LetterState::Returned, LetterState::Failed,     LetterState::Uncertain, LetterState::Held};

/// The name under which a state is kept and told: "handed over".
char const* letterStateName(LetterState state);
/// Throws Error when no state has that name.
LetterState letterStateNamed(std::string const& name);

struct LetterReport {
    /// From 1, its place in the mailing.
    long long number = 0;
    /// The same at every attempt.
    std::string key;
    /// The name of the address that counts, or of the one that it falls back to.
    std::string channel;
    LetterState state = LetterState::Waiting;
    /// What the other side has said, or what keeps the letter where it is; one line.
    std::string says;
    /// Seconds since the epoch.
    long long changed = 0;
    /// Channels that it failed by before, in their order.
    std::vector<std::string> tried;

    LetterReport() = default;
    /// Throws Error on a state that is not known.
    explicit LetterReport(json::Object const& object);
    json::Object serialize() const;
    bool operator==(LetterReport const&) const = default;

    struct Keys;
};

/// An e-mail that tells of a mailing, or of one of its letters.
struct NoticeReport {
    /// From 1, among the notices of the mailing.
    long long number = 0;
    /// The same at every attempt.
    std::string key;
    /// The letter that it tells of; 0 where that is the mailing.
    long long letter = 0;
    LetterState state = LetterState::Held;
    /// As of a letter.
    std::string says;
    /// Seconds since the epoch.
    long long changed = 0;

    NoticeReport() = default;
    /// Throws Error on a state that is not known.
    explicit NoticeReport(json::Object const& object);
    json::Object serialize() const;
    bool operator==(NoticeReport const&) const = default;

    struct Keys;
};

/// What a person decides of a letter.
enum class LetterAction {
    /// An uncertain one has arrived.
    SettleDelivered,
    /// An uncertain one has not arrived.
    SettleFailed,
    /// It is to be handed over once more, under the same key.
    Resend,
};

/// Asks for a change of one letter, or of one notice.
struct LetterChange {
    static constexpr char const* KIND = "change_letter";
    static constexpr char const* IN_WORDS = "a change of a letter";

    LetterAction action = LetterAction::Resend;
    /// The pack id.
    std::string id;
    /// One of both is 0.
    long long letter = 0;
    long long notice = 0;

    LetterChange() = default;
    LetterChange(LetterAction wanted, std::string packId, long long ofLetter, long long ofNotice = 0);
    /// Throws Error on an action that there is not, and on a wrong type.
    explicit LetterChange(json::Object const& object);
    /// With "query", as the questions have it.
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
