#include <iostream>

#include "HostApp.h"

int main(int argc, char** argv) {
    return trelm::host::HostApp(std::cout, std::cerr).run(argc, argv);
}
