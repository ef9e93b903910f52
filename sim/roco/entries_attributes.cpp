// Entry points: route attributes, their constraints and their modifiers.
#include "frame.h"

using namespace rocosim;

namespace {

Setting settingOf(int32_t value) { return {false, value != 0, ""}; }

Setting settingOf(const char* value) {
    if (!value) fail(code::kInvalidArgument, "no value (null)");
    return {true, false, value};
}

// Sets a constraint or modifier; refuses a null name.
void set(Service& s, uint32_t part, bool modifiers, const char* name, Setting setting) {
    if (!name) fail(code::kInvalidArgument, "no name (null)");
    s.settings(part, modifiers)[name] = std::move(setting);
}

}  // namespace

uint32_t zrrocoapi_RouteAttributes_new(zrrocoapi_Status* st) {
    return Call("RouteAttributes_new").run(st, [](Service& s) { return s.newAttributes(); });
}

void zrrocoapi_RouteAttributes_destroy(uint32_t attributes) {
    Call("RouteAttributes_destroy").arg("attributes", attributes).run(nullptr, [=](Service& s) {
        s.destroyAttributes(attributes);
    });
}

// The handle of one part of the attributes; 0 for unknown attributes.
#define ZRROCOAPI_SIM_PART(name, part)                                                                     \
    uint32_t zrrocoapi_RouteAttributes_##name(uint32_t attributes) {                                       \
        return Call("RouteAttributes_" #name).arg("attributes", attributes).run(nullptr, [=](Service& s) { \
            return s.partOf(attributes, part);                                                             \
        });                                                                                                \
    }
ZRROCOAPI_SIM_PART(getConstraints, kConstraints)
ZRROCOAPI_SIM_PART(getSourceConstraints, kSourceConstraints)
ZRROCOAPI_SIM_PART(getDestinationConstraints, kDestinationConstraints)
ZRROCOAPI_SIM_PART(getOptionalModifiers, kOptionalModifiers)
ZRROCOAPI_SIM_PART(getRequiredModifiers, kRequiredModifiers)
#undef ZRROCOAPI_SIM_PART

// The three numeric settings of the attributes.
#define ZRROCOAPI_SIM_NUMBER(name, key, assign)                                                               \
    void zrrocoapi_RouteAttributes_##name(uint32_t attributes, int32_t key, zrrocoapi_Status* st) {           \
        Call("RouteAttributes_" #name).arg("attributes", attributes).arg(#key, key).run(st, [=](Service& s) { \
            RouteAttributes& a = s.attributes(attributes);                                                    \
            assign;                                                                                           \
        });                                                                                                   \
    }
ZRROCOAPI_SIM_NUMBER(setLifetime, lifetime, a.lifetime = lifetime)
ZRROCOAPI_SIM_NUMBER(setCalculationTargetState, state, a.calculationTargetState = state)
ZRROCOAPI_SIM_NUMBER(setForceMultiDeviceRoute, force, a.forceMultiDeviceRoute = force != 0)
#undef ZRROCOAPI_SIM_NUMBER

void zrrocoapi_RouteAttributes_setOwnerName(uint32_t attributes, const char* owner, zrrocoapi_Status* st) {
    Call("RouteAttributes_setOwnerName").arg("attributes", attributes).arg("owner", owner).run(st, [=](Service& s) {
        RouteAttributes& a = s.attributes(attributes);
        if (!owner) fail(code::kInvalidArgument, "no owner name (null)");
        a.owner = owner;
    });
}

// Boolean and text constraints (modifiers false) and modifiers (true).
#define ZRROCOAPI_SIM_SETTING(function, handle, modifiers, type)                                             \
    void zrrocoapi_##function(uint32_t handle, const char* name, type value, zrrocoapi_Status* st) {         \
        Call(#function).arg(#handle, handle).arg("name", name).arg("value", value).run(st, [=](Service& s) { \
            set(s, handle, modifiers, name, settingOf(value));                                               \
        });                                                                                                  \
    }
ZRROCOAPI_SIM_SETTING(RouteConstraints_setBoolConstraint, constraints, false, int32_t)
ZRROCOAPI_SIM_SETTING(RouteConstraints_setStringConstraint, constraints, false, const char*)
ZRROCOAPI_SIM_SETTING(RouteModifiers_setBoolModifier, modifiers, true, int32_t)
ZRROCOAPI_SIM_SETTING(RouteModifiers_setStringModifier, modifiers, true, const char*)
#undef ZRROCOAPI_SIM_SETTING
