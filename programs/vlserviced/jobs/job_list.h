#pragma once
// Jobs as clients are told of them.

#include "programs/policy/rights.h"
#include "programs/protocol/job.h"
#include "programs/vlserviced/settings/settings_service.h"
#include "programs/vlserviced/store/letter_store.h"

#include <filesystem>

namespace VlServiced {

/// Answers a question about jobs as they are at `now` (seconds since the epoch). Alarms follow from the
/// settings of their nodes. Of jobs of nodes that `to` does not cover nothing is told.
Protocol::JobsAnswer listJobs(Protocol::JobsQuery const& query, JobStore const& jobs,
                              LetterStore const& letters, SettingsService const& settings,
                              std::filesystem::path const& outbox, long long now, Policy::Grant const& to);

} // namespace VlServiced
