#ifndef ZRM_HOST_CONDITION_PARSER_H
#define ZRM_HOST_CONDITION_PARSER_H

#include "host/config/ConditionBuilder.h"

#include <string_view>

/// Reads one condition of the condition language: COLUMN OP VALUE. Text stands in single quotes,
/// in which two quotes in a row are one; numbers stand bare; `in` takes a list in brackets.
/// Immutable.
class ConditionParser {
public:
    explicit ConditionParser(std::string_view table) : m_builder(table) {}

    /// The condition, or the first thing that is wrong with it.
    ConditionBuilder::Result parse(std::string_view text) const;

private:
    ConditionBuilder m_builder;
};

#endif
