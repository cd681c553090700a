#ifndef ZRM_TESTS_TEST_TABLES_H
#define ZRM_TESTS_TEST_TABLES_H

#include <vector>

class TableManager;

/// The framework's register of tables, as a test sees and steers it.
class TestTables {
public:
    /// The managers registered so far.
    static std::vector<TableManager*>& registered() {
        static std::vector<TableManager*> managers;
        return managers;
    }
    /// What the next registrations return.
    static unsigned& registerStatus() {
        static unsigned status = 0;
        return status;
    }
};

#endif
