#ifndef ZRM_TESTS_SCAN_CASE_H
#define ZRM_TESTS_SCAN_CASE_H

#include <cstdint>
#include <random>
#include <string>

/// The generator of the randomised tests. ZRM_TEST_SEED repeats a run, ZRM_TEST_CASES sets the
/// number of cases; both are printed, so that a failure can be replayed.
class CaseGenerator {
public:
    explicit CaseGenerator(const char* what);

    int cases() const { return m_cases; }
    std::uint64_t seed() const { return m_seed; }
    /// A number from 0 up to, not including, `limit`.
    unsigned below(unsigned limit) { return static_cast<unsigned>(m_random() % limit); }
    bool oneIn(unsigned number) { return below(number) == 0; }
    template <std::size_t Size> std::string pick(const char* const (&choices)[Size]) {
        return choices[below(Size)];
    }

    /// A scan directive as StringParser builds it: literal text, one conversion, "%n".
    std::string scanDirective();
    /// A text that begins as the directive requires in about half of the cases.
    std::string textFor(const std::string& directive);

private:
    std::string literal();
    std::string scanSet();
    std::string number();

    std::uint64_t m_seed;
    int m_cases;
    std::mt19937_64 m_random;
};

#endif
