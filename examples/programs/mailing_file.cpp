// Writes a mailing file of two pages and reads one of them back.
#include "vlservice/vlservice.h"

#include <cstdio>
#include <iostream>
#include <string>

int main() {
    std::string const path = "example.mailing";
    auto const zipped = [](std::string const& text) {
        return PageSaverI::zipDbData(text.data(), text.size());
    };
    {
        PackWrapper mailing(path, PackWrapper::PURPOSE_OUTPUT, "mailing-1");
        mailing.savePage("letter.pdf", "1", zipped("the first page"));
        mailing.savePage("letter.pdf", "2", zipped("the second page"));
        if (!mailing.finalizeOutput(zipped(R"({"id":"mailing-1"})")))
            return 1;
    }
    {
        PackWrapper mailing(path, PackWrapper::PURPOSE_IMPORT, {});
        std::cout << mailing.packId() << " holds " << mailing.szBins() << " blobs\n";
        mailing.requestPageData("letter.pdf", "2", [](SharedMemBuffer blob) {
            SharedMemBuffer const page = PageLoaderI::unzipDbData(blob);
            std::cout << "page 2: " << std::string(page.data(), page.data() + page.size()) << '\n';
        });
    }
    std::remove(path.c_str());
}
