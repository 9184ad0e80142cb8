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

class Session {
public:
    Session(boost::asio::io_context& io, Folders folders, JobLimits const& limits,
            std::unique_ptr<SettingsStore> store);

    /// Answers a request of the page that was admitted; `what` is its name.
    void answer(std::string const& what, std::string body, Door::Respond const& respond);

private:
    Answer here(std::string const& what, json::Object const& query);
    Answer state();
    Answer reload();
    Answer save(json::Object const& query);
    static Answer schema();

    Folders folders_;
    std::unique_ptr<SettingsStore> store_;
    /// For the document that a person looks at.
    ReaderProcess front_;
};

} // namespace VlMail::Workbench
