#include "agent/zrmmain.h"

int main(int argc, char** argv) {
    return zrmMain(argc, argv);
}
