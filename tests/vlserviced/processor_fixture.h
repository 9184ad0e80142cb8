#pragma once
// A service without a connection, for tests of what commands do.

#include "programs/vlserviced/processor.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"
#include "vlservice/ipc/make_empty_cmd.h"
#include "vlservice/platform/log.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

/// A command is made of its number and the text of its request, as it is for
/// one that was received.
class ProcessorFixture : public testing::Test {
protected:
    ProcessorFixture() {
        formerSink_ = Log::setSink([this](int, std::string const& line) { log_.push_back(line); });
        std::filesystem::create_directory(outbox_);
        std::filesystem::create_directory(upload_);
    }
    ~ProcessorFixture() override { Log::setSink(formerSink_); }

    /// The response's text, or "failed: " and what was thrown.
    std::string send(int id, std::string const& request) {
        std::shared_ptr<Ipc::CmdVLSvcBase> const cmd =
            Ipc::makeEmptyCmd(static_cast<unsigned char>(id), processor_);
        try {
            static_cast<Ipc::JsonCmdBase&>(*cmd).deserializeReq(parse(request));
            std::string told = "never told";
            processor_->carryOut(cmd, by_, [&](std::string const& failure) { told = failure; });
            return told.empty() ? print(static_cast<Ipc::JsonCmdBase&>(*cmd).serializeResp())
                                : "failed: " + told;
        } catch (std::exception const& failure) {
            return std::string("failed: ") + failure.what();
        }
    }
    std::string processPack(std::string const& packId) {
        return send(25, R"({"db_conn":")" + folder_.path().string() + R"(","db_name":"packs.db","id":")" +
                            packId + "\"}");
    }

    /// Whoever sends.
    Policy::Grant by_ = Policy::Grant::ofService();
    TemporaryFolder folder_;
    std::filesystem::path outbox_ = folder_ / "outbox";
    std::filesystem::path upload_ = folder_ / "upload";
    std::vector<std::string> log_;
    Log::Sink formerSink_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::SettingsStore store_{*database_};
    VlServiced::History history_{*database_, [] { return 1000LL; }};
    VlServiced::SettingsService settings_{store_, &VlServiced::SettingsService::localClock, history_};
    VlServiced::DocumentStore documentStore_{*database_};
    VlServiced::DocumentService documents_{documentStore_, store_, settings_, [] { return 1000LL; },
                                           history_};
    VlServiced::JobStore jobs_{*database_};
    VlServiced::LetterRegister register_{*database_};
    VlServiced::LetterStore letters_{*database_, jobs_};
    VlServiced::LetterSurroundings letterSurroundings() {
        VlServiced::LetterSurroundings all{
            [](std::string const&, std::size_t, VlServiced::LetterSurroundings::Work const& work) { work(); },
            [](VlServiced::LetterSurroundings::Work const& work) { work(); },
            [](VlServiced::LetterSurroundings::Work const& work) { work(); },
            [] { return 1000LL; },
            [this] { return settings_.service(); },
            outbox_,
        };
        all.recorder = history_;
        return all;
    }
    VlServiced::LetterRunner carriers_{letters_, jobs_, letterSurroundings()};
    VlServiced::JobSurroundings jobSurroundings() {
        VlServiced::JobSurroundings all{
            [](VlServiced::JobSurroundings::Work const& work) { work(); },
            [](VlServiced::JobSurroundings::Work const& work) { work(); },
            [](VlServiced::JobSurroundings::Work const& work) { work(); },
            [] { return 1000LL; },
            [this] { return settings_.service(); },
            outbox_,
        };
        all.recorder = history_;
        all.letterRegister = &register_;
        return all;
    }
    VlServiced::JobRunner runner_{jobs_, jobSurroundings()};
    VlServiced::PackReception packs_{VlServiced::openSqlitePackStore(folder_ / "packs-of-service.db"), jobs_,
                                     VlServiced::ReceptionSurroundings{
                                         [](VlServiced::JobSurroundings::Work const& work) { work(); },
                                         [](VlServiced::JobSurroundings::Work const& work) { work(); },
                                         [] { return 1000LL; },
                                         [](std::string const&) { return std::nullopt; },
                                         [](std::string const&) { return false; },
                                     }};
    VlServiced::TokenStore tokenStore_{*database_};
    VlServiced::TokenService tokens_{tokenStore_, std::string(32, 't'), [] { return 1000LL; }, history_};
    VlServiced::Access access_{[] { return 1000LL; }};
    std::shared_ptr<VlServiced::Processor> processor_ =
        std::make_shared<VlServiced::Processor>(VlServiced::ProcessorSurroundings{
            settings_, documents_, tokens_, access_, history_, jobs_, runner_, carriers_, packs_, register_,
            outbox_, [] { return 1000LL; }, [] { return Protocol::HealthAnswer(); }});
};
