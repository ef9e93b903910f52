// Maps the codes of the components below the library onto the library's own codes.
#include "errors/zrerr.h"

namespace zrerr {
namespace {

struct Mapping {
    std::int32_t from;
    std::uint32_t to;
};

// Routing library (-89xxx), platform layer (-52xxx) and time-service client (0xBFFA85xx).
constexpr Mapping kMappings[] = {
    {-89162, 0xBFFA403B}, {-89161, 0xBFFA403B}, {-89160, 0xBFFA403A}, {-89159, 0xBFFA403A},
    {-89158, 0xBFFA4039}, {-89157, 0xBFFA4039}, {-89150, 0xBFFA4032}, {-89136, 0xBFFA4032},
    {-89133, 0xBFFA4032}, {-89122, 0xBFFA4032}, {-89120, 0xBFFA4032}, {-89142, 0xBFFA4038},
    {-89141, 0xBFFA4037}, {-89140, 0xBFFA4046}, {-89126, 0xBFFA4046}, {-89125, 0xBFFA4046},
    {-89124, 0xBFFA4046}, {-89139, 0xBFFA405F}, {-89138, 0xBFFF0042}, {-89137, 0xBFFF0042},
    {-89135, 0xBFFF0042}, {-89134, 0xBFFF0042}, {-89132, 0xBFFF0042}, {-89127, 0xBFFF0042},
    {-89123, 0xBFFF0042}, {-89130, 0xBFFA4016}, {-89129, 0xBFFA4036}, {-89106, 0xBFFA4036},
    {-89121, 0xBFFA4033}, {-89168, 0xBFFA4005}, {-52031, 0xBFFA4046}, {-52024, 0xBFFA406F},
    {-52018, 0xBFFA4018}, {-52017, 0xBFFA4002}, {-52012, 0xBFFF003C}, {-52001, 0xBFFF003C},
    {-52000, 0xBFFF003C}, {-52010, 0xBFFA401F}, {-52007, 0xBFFA400B}, {-52006, 0xBFFA4016},
    {-52005, 0xBFFF0078}, {-52004, 0xBFFA4005}, {-52003, 0xBFFA4005}, {-52002, 0xBFFA4003},
    {static_cast<std::int32_t>(0xBFFA8501), 0xBFFA4066},
    {static_cast<std::int32_t>(0xBFFA8502), 0xBFFA406E},
};

}  // namespace

std::int32_t normalize(std::int32_t code) noexcept {
    for (const Mapping& m : kMappings)
        if (m.from == code) return static_cast<std::int32_t>(m.to);
    return code;
}

}  // namespace zrerr
