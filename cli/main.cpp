// vorcal: the command-line companion of the codec adaptation layer (see vorcal help).
#include <cstdio>
#include <exception>

#include "verbs.hpp"

int main(int argc, char **argv)
{
    try {
        return vorcal::cli::Main(argc, argv, vorcal::cli::Console{});
    } catch (const std::exception &error) {
        // Only an allocation can throw here; report it as a data error like any other.
        std::fprintf(stderr, "vorcal: %s\n", error.what());
        return vorcal::cli::kExitData;
    }
}
