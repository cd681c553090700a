#ifndef ZRM_ERROR_TEXT_H
#define ZRM_ERROR_TEXT_H

namespace zrm {

/// The number and text of a system error, for messages with "errno = %d; %s" or "Return code = %d;
/// %s". Unlike strerror, it shares no buffer between threads. The text is "Unknown error" if the
/// system has none.
class ErrorText {
public:
    /// `number` is errno or the return code of a pthread call. Pass errno immediately, before
    /// another call can change it.
    explicit ErrorText(int number) noexcept;

    int number() const noexcept { return m_number; }
    const char* text() const noexcept { return m_text; }

private:
    int m_number;
    const char* m_text;
    char m_buffer[128];
};

} // namespace zrm

#endif
