// marrowdale_soak_writer ROOT SEED: for each line on standard input that is a number, takes that
// many steps at random in the tree, and answers with an empty line. Ends with its input.

#include <cstdlib>
#include <iostream>
#include <string>

#include "tests/history/RandomWriter.h"

int main(int argc, char** argv) {
    if (argc != 3) {
        return EXIT_FAILURE;
    }
    using marrowdale::tests::HardLinks;
    marrowdale::tests::RandomWriter writer(
        argv[1], static_cast<std::uint32_t>(std::strtoul(argv[2], nullptr, 10)),
        HardLinks::leftOut);
    for (int steps = 0; std::cin >> steps;) {
        writer.steps(steps);
        std::cout << std::endl;
    }
    return EXIT_SUCCESS;
}
