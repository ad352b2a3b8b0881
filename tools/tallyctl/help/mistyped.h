// What is wrong with a command line that cannot be taken, in one line.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace CLI {
class App;
}

namespace tbdaily {

// The candidate that takes the fewest letters to change, add, leave out or exchange with their neighbour;
// empty when none is near.
std::string mostSimilar(std::string_view word, const std::vector<std::string>& candidates);

// The first word that names no command or option, with the one that is most like it; empty when all do.
std::string unknownWord(const CLI::App& program, const std::vector<std::string>& words);

}  // namespace tbdaily
