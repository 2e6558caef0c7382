#pragma once

#include <cstddef>
#include <memory>
#include <type_traits>
#include <typeinfo>

#include "parvel/foundation/Value.h"

namespace parvel {

/// The checked casts: each returns its object argument when it passes, else null; a null object
/// gives null; none raises. The argument orders differ on purpose and are part of the interface.
///
/// Each stands in two forms: over a Value, whose class is its kind, and over a shared pointer to a
/// polymorphic class, where a protocol is an abstract class.

template <class T>
struct ClassOf {};
template <class T>
inline constexpr ClassOf<T> classOf{};

template <class P>
struct ProtocolOf {};
template <class P>
inline constexpr ProtocolOf<P> protocolOf{};

/// T as const as the object that it is cast from.
template <class T, class U>
using AsConstAs = std::conditional_t<std::is_const_v<U>, const T, T>;

/// Whether a kind of Value conforms to a protocol. It does only where this is specialised.
template <class Kind, class P>
inline constexpr bool conformsTo = false;

/// Passes when the object is of the class or of a subclass.
template <class T>
[[nodiscard]] const T* PVDynamicCast(ClassOf<T>, const Value* object) {
    return object ? object->as<T>() : nullptr;
}
template <class T, class U>
[[nodiscard]] std::shared_ptr<AsConstAs<T, U>> PVDynamicCast(ClassOf<T>,
                                                             const std::shared_ptr<U>& object) {
    return std::dynamic_pointer_cast<AsConstAs<T, U>>(object);
}

/// Passes when the object conforms to the protocol.
template <class P>
[[nodiscard]] const Value* PVProtocolCast(ProtocolOf<P>, const Value* object) {
    if (!object)
        return nullptr;
    bool conforms = false;
    switch (object->typeID()) {
        case TypeID::Null:
            conforms = conformsTo<Null, P>;
            break;
        case TypeID::Number:
            conforms = conformsTo<Number, P>;
            break;
        case TypeID::String:
            conforms = conformsTo<String, P>;
            break;
        case TypeID::Date:
            conforms = conformsTo<Date, P>;
            break;
        case TypeID::Data:
            conforms = conformsTo<Data, P>;
            break;
        case TypeID::Array:
            conforms = conformsTo<Array, P>;
            break;
        case TypeID::Dictionary:
            conforms = conformsTo<Dictionary, P>;
            break;
    }
    return conforms ? object : nullptr;
}
template <class P, class U>
[[nodiscard]] std::shared_ptr<U> PVProtocolCast(ProtocolOf<P>, const std::shared_ptr<U>& object) {
    return dynamic_cast<std::add_const_t<P>*>(object.get()) ? object : nullptr;
}

/// Passes when the object is of the class and conforms to each of the first `count` protocols,
/// tested in order; the first failure ends the test, and with a count of 0 the class decides alone.
template <class T, class... P>
[[nodiscard]] const T* PVClassAndProtocolCast(const Value* object, ClassOf<T> type,
                                              std::size_t count, ProtocolOf<P>... protocols) {
    [[maybe_unused]] std::size_t tested = 0;
    const T* cast = PVDynamicCast(type, object);
    const bool conforms =
        cast && ((tested++ >= count || PVProtocolCast(protocols, object) != nullptr) && ...);
    return conforms ? cast : nullptr;
}
template <class T, class U, class... P>
[[nodiscard]] std::shared_ptr<AsConstAs<T, U>> PVClassAndProtocolCast(
    const std::shared_ptr<U>& object, ClassOf<T> type, std::size_t count,
    ProtocolOf<P>... protocols) {
    [[maybe_unused]] std::size_t tested = 0;
    std::shared_ptr<AsConstAs<T, U>> cast = PVDynamicCast(type, object);
    const bool conforms =
        cast && ((tested++ >= count || PVProtocolCast(protocols, object) != nullptr) && ...);
    return conforms ? cast : nullptr;
}

/// Passes when the reference's run-time kind is the given one.
[[nodiscard]] inline const Value* PVRefTypeCast(TypeID type, const Value* reference) {
    return reference && reference->typeID() == type ? reference : nullptr;
}

/// Passes when the object is of exactly the given class, not of a subclass.
template <class U>
[[nodiscard]] std::shared_ptr<U> PVRefTypeCast(const std::type_info& type,
                                               const std::shared_ptr<U>& reference) {
    static_assert(std::is_polymorphic_v<U>, "only a polymorphic object knows its run-time class");
    return reference && typeid(*reference) == type ? reference : nullptr;
}

}  // namespace parvel
