// Writes the manual page of vlserviced and what shells complete, while the project is built.
#include "programs/base/error.h"
#include "programs/base/version.h"
#include "programs/manual/book.h"
#include "programs/vlserviced/options.h"

#include <exception>
#include <iostream>

namespace {

constexpr Manual::Topic TOPICS[] = {{"", "service.md", "Running it"}};

} // namespace

int main(int argc, char** argv) {
    try {
        if (argc != 2)
            throw Base::Error(Base::Code::Usage, "one folder is wanted");
        Manual::writeBook(argv[1], VlServiced::commandInfo(), TOPICS,
                          {"libVLService " + Base::projectVersion(), 8});
        return 0;
    } catch (std::exception const& failure) {
        std::cerr << argv[0] << ": " << failure.what() << '\n';
        return 1;
    }
}
