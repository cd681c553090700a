#ifndef ZRM_KEYWORD_FIELDS_H
#define ZRM_KEYWORD_FIELDS_H

namespace zrm {

/// A name that a format may give its fields. A table of names holds at most maxKeywords entries and
/// ends with an entry whose minimum is 0. The index of an entry is the field's print index.
struct _KeywordFields {
    static constexpr int maxKeywords = 100;

    const char* keyword;
    int minimum; ///< minimum number of leading characters to specify
};

} // namespace zrm

#endif
