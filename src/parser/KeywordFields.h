#ifndef ZRM_KEYWORD_FIELDS_H
#define ZRM_KEYWORD_FIELDS_H

namespace zrm {

/// One name that a format may give its fields. A table of them ends with an entry whose minimum
/// is 0 and holds at most maxKeywords others; an entry's place in it is the field's print index.
struct _KeywordFields {
    static constexpr int maxKeywords = 100;

    const char* keyword;
    int minimum; ///< leading characters of the keyword that must be given
};

} // namespace zrm

#endif
