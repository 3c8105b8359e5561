#pragma once

#include <iosfwd>
#include <optional>
#include <string>
#include <vector>

namespace marrowdale::benchmarks {

// The result: one line a comparison, in Markdown.
class Table {
  public:
    // Small trees say nothing about the targets, so a quick run leaves them out.
    enum class Targets { shown, leftOut };
    explicit Table(Targets targets = Targets::shown) : targets_(targets) {}

    struct Row {
        std::string what;
        std::string measured;  // with its unit
        std::string against;   // with its unit
        double ratio = 0;
        std::optional<double> target;  // most that the ratio should be; none: for information
    };
    void add(Row row);
    void heading(std::string text);
    // A line for what is left out, and why.
    void note(std::string text);
    void print(std::ostream& stream) const;

  private:
    Targets targets_;
    std::vector<Row> rows_;
};

// "1.23 s", "4.56 ms", "789 ns".
[[nodiscard]] std::string inWords(double seconds);
// "1,230 ns", for one of `count`.
[[nodiscard]] std::string each(double seconds, double count);

}  // namespace marrowdale::benchmarks
