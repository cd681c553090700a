#ifndef ZRM_ENTRY_ROW_H
#define ZRM_ENTRY_ROW_H

#include "base/UTF8Conv.h"
#include "logs/zrm_rmlogent_data.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace zrm {

class LogFile;

/// The row in which a log's thread builds its entries, one after another. It knows what the last
/// entry may have left in it, so that the next entry need not build all of it again. Only EntryRow
/// writes to it.
class OwnRow {
public:
    /// The row itself. Its content is that of the last entry that was accepted.
    zrm_rmlogent_data_t* columns() noexcept { return &m_columns; }

private:
    friend class EntryRow;

    zrm_rmlogent_data_t m_columns{};
    /// The common columns are filled, and the columns of the entry are blank except for those
    /// before ENTRYDESC and UENTRYDESC and the two lengths below.
    bool m_isReusable = false;
    std::size_t m_descriptionLength = 0;       ///< characters of ENTRYDESC that may not be blank
    std::size_t m_descriptionLengthInUTF8 = 0; ///< the same for UENTRYDESC
};

/// A row while a log type fills it from one entry. It begins with the common columns filled and all
/// others blank, whether it is the log's own row, which is only cleared where the last entry wrote,
/// or any other. Lives on the stack of one thread.
class EntryRow {
public:
    /// `row` is a zrm_rmlogent_data_t with any content.
    EntryRow(LogFile& log, void* row);
    EntryRow(const EntryRow&) = delete;
    EntryRow& operator=(const EntryRow&) = delete;

    zrm_rmlogent_data_t& columns() const noexcept { return m_columns; }
    zrm_rmlogent_data_t* operator->() const noexcept { return &m_columns; }
    bool isOwn() const noexcept { return m_own != nullptr; }

    /// States that nothing was written outside the columns of the entry, and that the descriptions
    /// have these lengths; a negative one is unknown. Saves clearing both columns to their ends
    /// for the next entry.
    void setDescriptionLengths(std::size_t length, std::int32_t lengthInUTF8) noexcept {
        if (m_own != nullptr) {
            m_own->m_descriptionLength = std::min(length, sizeof m_columns.entrydesc);
            // A negative length becomes huge, so the whole column counts.
            m_own->m_descriptionLengthInUTF8 =
                std::min(static_cast<std::size_t>(lengthInUTF8), sizeof m_columns.uentrydesc);
        }
    }
    /// Fills UENTRYSRC and UENTRYDESC of an entry of a followed log from the texts of ENTRYSRC and
    /// ENTRYDESC, and states the lengths of the descriptions.
    void fillInUTF8(std::string_view source, std::string_view description) {
        UTF8Conv::columnToUTF8(m_columns.uentrysrc, sizeof m_columns.uentrysrc, source);
        setDescriptionLengths(
            description.size(),
            UTF8Conv::columnToUTF8(m_columns.uentrydesc, sizeof m_columns.uentrydesc, description));
    }
    /// Fills the common columns again, because the text of a field has overrun them.
    void restoreCommonColumns();
    /// Blanks the whole row, because the entry is rejected.
    void reject();

private:
    const LogFile& m_log;
    zrm_rmlogent_data_t& m_columns;
    OwnRow* const m_own; ///< null: the row is not the log's own
};

} // namespace zrm

#endif
