#pragma once
// What the service knows of a mailing that it was given.

#include <filesystem>
#include <string>

namespace VlServiced {

/// The way of a job. The names, in job_store.cpp, are kept in the database and told to clients.
enum class JobState {
    /// On record; the pages still lie with the client alone.
    Accepted,
    /// The container is in the outbox.
    Queued,
    /// The container lies in the upload folder under a temporary name and is about to get its own.
    Submitting,
    /// The container is in the upload folder.
    Submitted,
    /// The container was taken from the upload folder.
    Lodged,
    /// The carrier reported that the mailing is done.
    Delivered,
    /// Given up; `problem` says why.
    Failed,
};

/// Where a pack's pages lie.
struct PackLocation {
    std::string folder;
    std::string database;
    std::string packId;

    std::filesystem::path file() const { return std::filesystem::path(folder) / database; }
    bool operator==(PackLocation const&) const = default;
};

struct Job {
    PackLocation pack;
    /// The settings node that the mailing is sent for; the empty text is the root.
    std::string cfgId;
    std::string title;
    long long documents = 0;
    long long pages = 0;
    JobState state = JobState::Accepted;
    /// Why the job failed, or what keeps it where it is; otherwise empty.
    std::string problem;
    /// Whether the container is to be handed on as soon as it is there.
    bool toUpload = false;
    /// Where the container goes, or went; empty before Submitting.
    std::string uploadFolder;
    /// Seconds since the epoch.
    long long acceptedAt = 0;
    long long changedAt = 0;

    /// The name of its container in the outbox and in the upload folder.
    std::string containerName() const { return pack.packId + ".mailing"; }
};

char const* stateName(JobState state);

} // namespace VlServiced
