#include "host/cli/Program.h"

#include <clocale>

int main(int argc, char** argv) {
    std::setlocale(LC_CTYPE, ""); // whether the terminal takes UTF-8
    return Program().run(argc, argv);
}
