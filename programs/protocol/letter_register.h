#pragma once
// Which letters went out before, as client and service speak of it.

#include "vlservice/json/json.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Protocol {

/// Asks which of some letters are in the register of letters.
struct RegisterQuery {
    static constexpr char const* KIND = "register";
    static constexpr char const* IN_WORDS = "a query for the register of letters";
    static constexpr std::size_t MAX_DIGESTS = 1000;
    static constexpr std::size_t MAX_PACKS = 1000;

    /// The node that they are to be sent for.
    std::string id;
    /// Of letters, as metadata of mailings has them.
    std::vector<std::string> digests;
    /// Ids of packs whose letters are none that went out before: sending one of these again is no second
    /// sending.
    std::vector<std::string> besides;

    RegisterQuery() = default;
    /// Throws Error on a wrong type.
    explicit RegisterQuery(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// A letter that went out before.
struct RegisteredLetter {
    std::string digest;
    /// When its mailing was accepted, in seconds since the epoch.
    long long at = 0;
    /// The mailing; empty where it is one of a node that the asker's token does not cover.
    std::string pack;
    /// Of the letter, where it goes by a carrier, or of its mailing; empty where neither is on record any
    /// more, or not the asker's affair.
    std::string state;

    RegisteredLetter() = default;
    explicit RegisteredLetter(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Those alone that are there, in the order in which they were asked for.
struct RegisterAnswer {
    std::vector<RegisteredLetter> letters;

    RegisterAnswer() = default;
    explicit RegisterAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
