#pragma once
// Who acts on each key of the settings, for those who tell people that a key changes nothing.

#include "vlservice/json/record_keys.h"

#include <span>
#include <string_view>

namespace VlMail {

enum class Actor { Library, Reader, Client, Service, ClientAndService, Nobody };

struct ActingRow {
    char const* key;
    Actor actor;
};

/// The keys of one record, in the order of its own table.
struct ActingRecord {
    json::RecordKeys const& (*keys)();
    std::span<ActingRow const> rows;
};

/// Every record of the settings whose keys are a person's to set.
std::span<ActingRecord const> actingRecords();

/// Whether programs keep the key, hand it on and do nothing else. False for what is no such record or key.
bool isCarriedOnly(json::RecordKeys const& record, std::string_view key);

/// "client and service".
char const* inWords(Actor actor);

} // namespace VlMail
