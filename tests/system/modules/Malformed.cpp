// API modules that a server must leave out: one for each ORVA_FAULT_... definition.
#include "platform/webapi.h"

namespace {

[[maybe_unused]] void Method(ORVA::APIRequest*, ORVA::APIResponse* response) {
    response->SetSuccess(Json::Value("from a module that should have been left out"));
}

// A table without an end: whatever row is read, it is a good one.
template <std::size_t rows>
struct Endless {
    ORVA::APITableRow table[rows];
    std::string names[rows];

    Endless() {
        for (std::size_t row = 0; row < rows; ++row) {
            names[row] = "method" + std::to_string(row);
            table[row] = {"Test.Endless", 1, names[row].c_str(), &Method};
        }
    }
};

[[maybe_unused]] const ORVA::APITableRow kGoodRow = {"Test.Malformed", 1, "good", &Method};
[[maybe_unused]] const ORVA::APITableRow kEnd = {nullptr, 0, nullptr, nullptr};

}  // namespace

#if !defined(ORVA_FAULT_NO_FUNCTION)
const ORVA::APITableRow* GetAPITable() {
#if defined(ORVA_FAULT_NULL_TABLE)
    return nullptr;
#elif defined(ORVA_FAULT_ENDLESS)
    static const Endless<2048> endless;
    return endless.table;
#else
#if defined(ORVA_FAULT_NULL_METHOD)
    static const ORVA::APITableRow row = {"Test.Malformed", 1, nullptr, &Method};
#elif defined(ORVA_FAULT_NULL_FUNCTION)
    static const ORVA::APITableRow row = {"Test.Malformed", 1, "bad", nullptr};
#elif defined(ORVA_FAULT_EMPTY_API)
    static const ORVA::APITableRow row = {"", 1, "bad", &Method};
#elif defined(ORVA_FAULT_EMPTY_METHOD)
    static const ORVA::APITableRow row = {"Test.Malformed", 1, "", &Method};
#elif defined(ORVA_FAULT_VERSION_ZERO)
    static const ORVA::APITableRow row = {"Test.Malformed", 0, "bad", &Method};
#elif defined(ORVA_FAULT_REPEATED)
    static const ORVA::APITableRow row = kGoodRow;
#elif defined(ORVA_FAULT_INTRUDING)
    static const ORVA::APITableRow row = {"Test.Echo", 1, "more", &Method};
#elif defined(ORVA_FAULT_TAKEN)
    static const ORVA::APITableRow row = {"Test.Echo", 1, "echo", &Method};
#endif
    static const ORVA::APITableRow table[] = {kGoodRow, row, kEnd};
    return table;
#endif
}
#endif
