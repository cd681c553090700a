#include "agent/zrmmain.h"

using namespace zrm;

int main(int argc, char** argv) {
    return zrmMain(argc, argv);
}
