// Holds the examples of docs/service.md against the code: every request is sent, every answer compared.
#include "programs/vlserviced/jobs/job_list.h"
#include "programs/vlserviced/settings/parts.h"
#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/processor_fixture.h"

#include <gtest/gtest.h>

#include <fstream>
#include <sstream>

namespace {

std::string replaced(std::string text, std::string const& what, std::string const& by) {
    for (std::size_t at = text.find(what); at != std::string::npos; at = text.find(what, at + by.size()))
        text.replace(at, what.size(), by);
    return text;
}

std::string document() {
    std::ifstream in(SERVICE_DOCUMENT);
    return {std::istreambuf_iterator<char>(in), {}};
}

class ServiceDocument : public ProcessorFixture {};

TEST_F(ServiceDocument, HasExamplesThatAreAnsweredAsItSays) {
    storePack(folder_ / "packs.db", "p1");
    std::istringstream lines(replaced(document(), "FOLDER", folder_.path().string()));
    std::string answer;
    int examples = 0;
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with("> ")) {
            std::istringstream request(line.substr(2));
            int id = 0;
            std::string body;
            request >> id;
            std::getline(request >> std::ws, body);
            answer = send(id, body);
        } else if (line.starts_with("< ")) {
            EXPECT_EQ(answer, line.substr(2));
            ++examples;
        }
    }
    EXPECT_GT(examples, 20);
}

TEST_F(ServiceDocument, NamesEveryStateAndEveryKeyOfAJob) {
    std::string const text = document();
    for (Protocol::JobState const state : Protocol::ALL_JOB_STATES)
        EXPECT_NE(text.find("| \"" + std::string(stateName(state)) + "\" |"), std::string::npos)
            << stateName(state);
    for (char const* key : {"problem", "alarm", "to_upload", "container", "accepted", "changed", "documents"})
        EXPECT_NE(text.find('"' + std::string(key) + '"'), std::string::npos) << key;
}

} // namespace
