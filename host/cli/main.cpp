#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/Program.h"
#include "host/framework/TraceControl.h"

#include <clocale>
#include <cstdlib>
#include <string>

using namespace zrm::host;

int main(int argc, char** argv) {
    std::setlocale(LC_CTYPE, ""); // determines whether the terminal accepts UTF-8
    // The agent's code used here also traces; show that to the operator only on demand.
    const char* const levels = std::getenv("QFW_TRC1");
    if (const Result<void> configured =
            TraceControl::configure(levels == nullptr ? "none" : levels);
        !configured) {
        Context::note("QFW_TRC1: " + configured.error().text());
        return static_cast<int>(CliStatus::USAGE);
    }
    return static_cast<int>(Program().run(argc, argv));
}
