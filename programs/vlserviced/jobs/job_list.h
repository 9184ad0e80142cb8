#pragma once
// Jobs as clients are told of them.

#include "programs/vlserviced/settings/settings_service.h"
#include "programs/vlserviced/store/job_store.h"
#include "vlservice/json/json.h"

namespace VlServiced {

/// Answers a query for jobs: "db_host", "db_name" (texts), "ids" (an array of pack ids) and "limit" choose;
/// what is missing is no restriction, and at most 1,000 jobs, the youngest, are told of unless "limit" says
/// less. The answer has "jobs", an array in the order of acceptance: "id", "state", "title", "cfg_id",
/// "db_host", "db_name", "documents", "pages", "accepted" and "changed" (seconds since the epoch), and where
/// there is something to say "problem", "alarm", "to_upload" (true) and "container" (a path).
/// Throws Error on a wrong type.
json::Object listJobs(json::Object const& query, JobStore const& jobs, SettingsService const& settings,
                      std::filesystem::path const& outbox, long long now);

} // namespace VlServiced
