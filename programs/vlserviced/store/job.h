#pragma once
// What the service knows of a mailing that it was given.

#include "programs/protocol/job.h"
#include "programs/protocol/pack_upload.h"

#include <filesystem>
#include <optional>
#include <string>

namespace VlServiced {

using Protocol::JobState;

/// Where a pack's pages lie.
struct PackLocation {
    std::string folder;
    std::string database;
    std::string packId;

    /// Whether they came over a connection and lie in the service's own store.
    bool isWithService() const { return folder == Protocol::OVER_CONNECTION; }
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
    /// Until when it is held, seconds since the epoch; 0 when it is not, or until a person releases it.
    long long due = 0;
    /// Whether it is held until a person releases it.
    bool toHold = false;
    /// Whether its container is made and nothing handed over.
    bool isTrial = false;
    /// Where the container goes, or went; empty before Submitting.
    std::string uploadFolder;
    /// Which of all folders of that name it is, as FolderIdentity tells it.
    std::string uploadFolderIdentity;
    /// Grows each time that somebody takes hold of it.
    long long fence = 0;
    /// The fence under which its container was staged that is handed over.
    long long submitFence = 0;
    /// Whether its letters were divided among the channels.
    bool isDivided = false;
    /// Where some of its letters go by carriers and others in a container: how far the former are.
    std::optional<JobState> lettersState = {};
    std::string lettersProblem = {};
    /// Seconds since the epoch.
    long long acceptedAt = 0;
    long long changedAt = 0;

    /// The name of its container in the outbox and in the upload folder.
    std::string containerName() const { return pack.packId + ".mailing"; }
};

/// Whether the pages of a job are of no use any more: its container and its letters were handed over, or
/// never will be.
bool isDoneWithPages(Job const& job);
/// Whether nothing more will happen to a job in that state.
bool hasEnded(JobState state);
/// Whether the service itself goes on with it when somebody takes hold of it.
bool isToWorkOn(Job const& job);

} // namespace VlServiced
