#include "parser/PrintProgram.h"

#include "ScanCase.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <cstdio>
#include <cstring>
#include <limits>
#include <string>

using namespace zrm;

namespace {

/// A value of one data type, as the receiving variable holds it.
struct Value {
    alignas(std::max_align_t) char bytes[64] = "";
};

std::string printed(const std::string& directive, _DataType type, const Value& value, long room) {
    PrintProgram program;
    EXPECT_TRUE(program.compile(directive.c_str(), type));
    std::string text(static_cast<std::size_t>(room) + 8, '#');
    _FormatBuffer buffer{text.data(), room};
    EXPECT_TRUE(program.run(value.bytes, buffer));
    EXPECT_EQ(buffer.position, text.data() + (room - buffer.room));
    const auto used = static_cast<std::size_t>(room - buffer.room);
    EXPECT_EQ(text.find_first_not_of('#', used), text.npos) << "written past the text";
    text.resize(used);
    return text;
}

template <typename Type> Type as(const Value& value) {
    Type result;
    std::memcpy(&result, value.bytes, sizeof result);
    return result;
}

template <typename Argument>
std::string byLibrary(const std::string& directive, Argument argument, long room) {
    char text[9000];
    const int length = std::snprintf(text, sizeof text, directive.c_str(), argument);
    return std::string(text, static_cast<std::size_t>(length))
        .substr(0, static_cast<std::size_t>(room));
}

std::string printedByLibrary(const std::string& directive, _DataType type, const Value& value,
                             long room) {
    switch (findDataType(type)->receiver) {
    case Receiver::INTEGER2:
        return byLibrary(directive, int{as<std::int16_t>(value)}, room);
    case Receiver::INTEGER4:
        return byLibrary(directive, as<std::int32_t>(value), room);
    case Receiver::INTEGER8:
        return byLibrary(directive, as<std::int64_t>(value), room);
    case Receiver::FLOAT:
        return byLibrary(directive, double{as<float>(value)}, room);
    case Receiver::DOUBLE:
        return byLibrary(directive, as<double>(value), room);
    case Receiver::LONG_DOUBLE:
        return byLibrary(directive, as<long double>(value), room);
    case Receiver::CHARACTER:
        return byLibrary(directive, int{value.bytes[0]}, room);
    case Receiver::TEXT:
        return byLibrary(directive, static_cast<const char*>(value.bytes), room);
    }
    return "";
}

/// Print directives with values, as the format language allows them.
class PrintCases : public CaseGenerator {
public:
    PrintCases() : CaseGenerator("PrintProgram against snprintf") {}

    _DataType type() {
        constexpr int types[] = {1,  3,  4,  6,  7,  8,  8,  9,  21, 23, 24, 31,
                                 33, 34, 36, 37, 41, 43, 44, 46, 47, 51, 53, 54};
        return static_cast<_DataType>(types[below(std::size(types))]);
    }

    std::string directive(_DataType type) {
        constexpr const char* texts[] = {"", "", "", "day ", "%%", "<", "100%% "};
        constexpr const char* options[] = {"", "", "", "0", "-", "+", " ", "#", "'"};
        constexpr const char* integers[] = {"d", "i", "u", "o", "x", "X"};
        constexpr const char* floats[] = {"e", "E", "f", "g", "G"};
        const bool isText = type == DATATYPE_STRING || type == DATATYPE_CHAR;
        std::string result = pick(texts);
        if (oneIn(12)) {
            return result;
        }
        std::string option = pick(options);
        if (isText && option.find_first_of("0+ #'") != std::string::npos) {
            option = "-";
        }
        result += "%" + option;
        if (oneIn(2)) {
            result += std::to_string(1 + below(oneIn(5) ? 256 : 12));
        }
        if (type != DATATYPE_CHAR && oneIn(5)) {
            result += "." + (oneIn(4) ? "" : std::to_string(below(99)));
        }
        constexpr const char* sizes[] = {"", "", "h", "l", "L", "ll"};
        result += sizes[type / 10];
        if (isText) {
            result += type == DATATYPE_CHAR ? "c" : "s";
        } else {
            result += type % 10 < 5 ? pick(integers) : pick(floats);
        }
        return result + pick(texts);
    }

    Value value(_DataType type) {
        constexpr const char* texts[] = {"a", "sshd", "a text of some length", "-", "%d"};
        constexpr long double numbers[] = {0.0L, -0.0L, 1.5L, -3.14159L, 1e30L, 1e-30L, 99999.9L};
        Value result;
        const Receiver receiver = findDataType(type)->receiver;
        const auto set = [&](auto number) { std::memcpy(result.bytes, &number, sizeof number); };
        const long double number = numbers[below(std::size(numbers))];
        if (receiver == Receiver::TEXT || receiver == Receiver::CHARACTER) {
            std::strcpy(result.bytes, texts[below(std::size(texts))]);
        } else if (receiver == Receiver::FLOAT) {
            set(static_cast<float>(number));
        } else if (receiver == Receiver::DOUBLE) {
            set(static_cast<double>(number));
        } else if (receiver == Receiver::LONG_DOUBLE) {
            set(number);
        } else {
            constexpr std::int64_t edges[] = {0,
                                              -1,
                                              7,
                                              std::numeric_limits<std::int64_t>::min(),
                                              std::numeric_limits<std::int32_t>::min(),
                                              std::numeric_limits<std::int16_t>::min(),
                                              std::numeric_limits<std::int64_t>::max()};
            set(oneIn(2) ? edges[below(std::size(edges))]
                         : static_cast<std::int64_t>(below(1U << 31)) - (1 << 20));
        }
        return result;
    }
};

TEST(PrintProgram, AgreesWithTheCLibrary) {
    PrintCases cases;
    for (int number = 0; number < cases.cases(); ++number) {
        const _DataType type = cases.type();
        const std::string directive = cases.directive(type);
        const Value value = cases.value(type);
        const long room = cases.oneIn(3) ? 1 + static_cast<long>(cases.below(20)) : 600;
        ASSERT_EQ(printed(directive, type, value, room),
                  printedByLibrary(directive, type, value, room))
            << "case " << number << ": " << directive << " for type " << type << " in " << room;
    }
}

TEST(PrintProgram, PrintsSmallNumbersAsTheCLibraryDoes) {
    for (std::int32_t number = -20; number < 11000; ++number) {
        Value value;
        std::memcpy(value.bytes, &number, sizeof number);
        for (const char* const directive : {"%d", "%1d", "%2d", "%02d", "%3d", "%04d", "%5d"}) {
            for (const long room : {2L, 3L, 4L, 20L}) {
                ASSERT_EQ(printed(directive, DATATYPE_INT, value, room),
                          printedByLibrary(directive, DATATYPE_INT, value, room))
                    << directive << " of " << number << " in " << room;
            }
        }
    }
}

TEST(PrintProgram, RefusesNumbersThatAreNotDataTypes) {
    PrintProgram program;
    EXPECT_FALSE(program.compile("%d", static_cast<_DataType>(10)));
    EXPECT_FALSE(program.isCompiled());
    EXPECT_TRUE(program.compile("%d", DATATYPE_INT));
    EXPECT_TRUE(program.isCompiled());
}

TEST(DataTypes, StandAloneInTheirTable) {
    int known = 0;
    for (int type = -2; type < 70; ++type) {
        const DataTypeInfo* const info = findDataType(static_cast<_DataType>(type));
        if (info != nullptr) {
            ++known;
            EXPECT_EQ(info->type, type);
            ASSERT_NE(findDataType(info->group), nullptr);
            EXPECT_EQ(findDataType(info->group)->group, info->group);
            EXPECT_EQ(findDataType(info->group)->receiver, info->receiver);
        }
    }
    EXPECT_EQ(known, 31);
}

} // namespace
