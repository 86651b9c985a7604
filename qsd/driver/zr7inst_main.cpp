#include "qsd/driver/driver.h"

int main(int argc, char** argv) {
    return zr7::run_main(argc, argv);
}
