#pragma once
// Packs whose pages go to the service over the connection: what is said before the pages come.

#include "vlservice/json/json.h"

#include <string>

namespace Protocol {

/// What Process Pack names, and jobs are told of, instead of the folder and the file of a pack database.
inline constexpr char const* OVER_CONNECTION = "channel";
inline constexpr char const* PACKS_OF_CONNECTION = "packs";

/// Begins a pack, or goes on with one: from here on the connection may send its pages.
struct BeginPack {
    static constexpr char const* KIND = "begin_pack";
    static constexpr char const* IN_WORDS = "the beginning of a pack";
    /// The key of its node: "id" is that of the pack.
    static constexpr char const* CFG_ID = "cfg_id";
    /// Of a pack, metadata included.
    static constexpr long long MAX_BYTES = 8LL << 30;
    static constexpr long long MAX_PAGES = 10'000'000;

    std::string id;
    /// The settings node that it is sent for.
    std::string cfgId;
    std::string title;
    long long pages = 0;
    /// Of all blobs, that of the metadata included.
    long long bytes = 0;
    /// Of all of it, as Mailing::PackDigest computes it.
    std::string sha256;
    /// Only asks what is there, without beginning anything.
    bool asks = false;

    BeginPack() = default;
    /// Throws Error on a wrong type and on numbers out of their bounds.
    explicit BeginPack(json::Object const& object);
    /// With "query", as the questions have it.
    json::Object serialize() const;

    struct Keys;
};

struct BeginPackAnswer {
    /// How many of its pages, and behind them the metadata, are there; the next one is that position.
    long long have = 0;
    /// Whether a job of it is on record already: nothing is to be sent.
    bool isAccepted = false;

    BeginPackAnswer() = default;
    explicit BeginPackAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
