#include <iostream>

#include "HostApp.h"

int main(int argc, char** argv) {
    return trelm::host::HostApp(std::cin, std::cout, std::cerr).run(argc, argv);
}
