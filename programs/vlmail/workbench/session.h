#pragma once
// A workbench's side of the conversation with its page: what is asked is done here, or by the reading
// processes.

#include "programs/vlmail/workbench/desk.h"
#include "programs/vlmail/workbench/door.h"
#include "programs/vlmail/workbench/reader_process.h"
#include "programs/vlmail/workbench/settings_store.h"

#include <memory>
#include <string>

namespace VlMail::Workbench {

/// Documents whose verdicts were asked for at once.
struct Batch;

class Session {
public:
    Session(boost::asio::io_context& io, Folders folders, JobLimits const& limits,
            std::unique_ptr<SettingsStore> store);

    /// Answers a request of the page that was admitted; `what` is its name.
    void answer(std::string const& what, std::string body, Door::Respond const& respond);

private:
    static Answer here(std::string const& what);
    static Answer schema();
    void ofStore(std::string const& what, std::string body, Door::Respond const& respond);
    json::Object takeInherited(json::Object const& told);
    json::Object state(json::Object const& stored) const;
    std::string inContext(json::Object query, std::string body) const;
    void judge(json::Object const& query, Door::Respond const& respond);
    void passOverMissing(Batch& batch) const;
    void judgeNext(std::shared_ptr<Batch> const& batch);
    void keepGolden(json::Object const& query, std::string body, Door::Respond const& respond);
    void requireDocument(std::string const& name) const;

    Folders folders_;
    std::shared_ptr<SettingsStore> store_;
    /// As the store has told it last.
    std::string inherited_;
    /// Asks the store: a service may take its time.
    ReaderProcess keeper_;
    /// For the document that a person looks at.
    ReaderProcess front_;
    /// For all the others, and for what takes longer, behind it.
    ReaderProcess back_;
    /// The verdicts that were asked for last.
    std::shared_ptr<Batch> batch_;
};

} // namespace VlMail::Workbench
