// Declarative maps between native records and Java objects.
//
// A map lists, for one Java class, its fields in the order they are looked up and set: the
// Java name, the JNI signature, and the offset, width and conversion taken from the record's
// own member, so a map cannot disagree with the record's layout. The generic readers and
// writers below walk a map; each record's conversions live in one reviewable table.
#pragma once

#include <nativehelper/jni.h>

#include <cstddef>
#include <cstdint>
#include <type_traits>
#include <utility>

namespace dvbjni {

enum class Conv : uint8_t {
    Int32,       // "I", 32 bits either way
    UInt8,       // "I", low 8 bits into the record, zero-extended out of it
    UInt16,      // "I", low 16 bits in, zero-extended out
    Int16,       // "I", low 16 bits in, sign-extended out
    UInt32Long,  // "J", low 32 bits in, zero-extended out
    Int64,       // "J", 64 bits either way
    Text,        // "Ljava/lang/String;" zero-ended text; into the record: cut at the field's end
    TextOrNull,  // "Ljava/lang/String;" as Text, but an empty field reaches Java as null
    LangCode,    // "Ljava/lang/String;" three-byte language code: its first three bytes in
    LangCodeOr,  // as LangCode, but a null string keeps the code the record already holds
    Bytes,       // "[B" zero-ended text as exactly its bytes, no conversion
    AllBytes,    // "[B" every byte of the field
};

struct JavaField {
    const char* name;
    const char* signature;
    uint32_t offset;
    uint32_t width;
    Conv conv;
};

template <typename T>
constexpr JavaField intField(const char* name, size_t offset) {
    static_assert(std::is_integral_v<T> && sizeof(T) <= sizeof(jint), "a Java int holds 32 bits");
    Conv conv = std::is_same_v<T, uint8_t>    ? Conv::UInt8
                : std::is_same_v<T, uint16_t> ? Conv::UInt16
                : std::is_same_v<T, int16_t>  ? Conv::Int16
                                              : Conv::Int32;
    static_assert(sizeof(T) != 1 || std::is_same_v<T, uint8_t>, "8-bit fields are unsigned");
    return {name, "I", static_cast<uint32_t>(offset), sizeof(T), conv};
}

template <typename T>
constexpr JavaField longField(const char* name, size_t offset) {
    static_assert(std::is_same_v<T, uint32_t> || std::is_same_v<T, int64_t>,
                  "a Java long takes an unsigned 32-bit or a 64-bit field");
    return {name, "J", static_cast<uint32_t>(offset), sizeof(T),
            std::is_same_v<T, uint32_t> ? Conv::UInt32Long : Conv::Int64};
}

template <typename T>
constexpr JavaField textField(const char* name, size_t offset, Conv conv) {
    static_assert(std::is_array_v<T> && sizeof(std::remove_extent_t<T>) == 1,
                  "text lives in a byte array field");
    const char* sig = (conv == Conv::Bytes || conv == Conv::AllBytes) ? "[B" : "Ljava/lang/String;";
    return {name, sig, static_cast<uint32_t>(offset), sizeof(T), conv};
}

}  // namespace dvbjni

#define DVB_FIELD_TYPE(Record, member) \
    std::remove_reference_t<decltype(std::declval<Record&>().member)>

// A Java int field mapped to an integer member of up to 32 bits.
#define JF_INT(Record, member, javaName) \
    ::dvbjni::intField<DVB_FIELD_TYPE(Record, member)>(javaName, offsetof(Record, member))
// A Java long field mapped to an unsigned 32-bit or a 64-bit member.
#define JF_LONG(Record, member, javaName) \
    ::dvbjni::longField<DVB_FIELD_TYPE(Record, member)>(javaName, offsetof(Record, member))
// A Java String or byte[] field mapped to a byte-array member, with the conversion named.
#define JF_TEXT(Record, member, javaName, conv)                                             \
    ::dvbjni::textField<DVB_FIELD_TYPE(Record, member)>(javaName, offsetof(Record, member), \
                                                        ::dvbjni::Conv::conv)

namespace dvbjni {

// The class and field IDs of one map, looked up by name.
class FieldIds {
public:
    static constexpr size_t kMax = 32;

    // Finds `className` and every field of `map`, in order. Stops at the first failure and
    // leaves its NoClassDefFoundError or NoSuchFieldError pending.
    bool lookup(JNIEnv* env, const char* className, const JavaField* map, size_t count);

    // The same for a class already found, so that two maps of one class share its look-up.
    bool lookup(JNIEnv* env, jclass cls, const JavaField* map, size_t count);

    template <size_t N>
    bool lookup(JNIEnv* env, const char* className, const JavaField (&map)[N]) {
        static_assert(N <= kMax, "map too long");
        return lookup(env, className, map, N);
    }

    jfieldID operator[](size_t i) const { return mIds[i]; }

private:
    jfieldID mIds[kMax];
};

// Copies the fields of `object` into the record at `record`, by `map`. Returns false with a
// Java exception pending: NullPointerException for a null string (`className` names it).
bool readRecord(JNIEnv* env, jobject object, const char* className, const JavaField* map,
                const FieldIds& ids, size_t count, void* record);

// Sets the fields of `object` from the record at `record`, by `map`. Returns false with an
// exception pending when a Java string or array cannot be made.
bool writeRecord(JNIEnv* env, jobject object, const JavaField* map, const FieldIds& ids,
                 size_t count, const void* record);

// Looks up `className` and `map`, then reads `object` into `record`. A null `object` raises
// NullPointerException naming the class and reads nothing.
template <size_t N>
bool readFields(JNIEnv* env, jobject object, const char* className, const JavaField (&map)[N],
                void* record);

// Looks up `className` and `map`, then writes `record` into `object`. A null `object` raises
// NullPointerException naming the class and writes nothing.
template <size_t N>
bool writeFields(JNIEnv* env, jobject object, const char* className, const JavaField (&map)[N],
                 const void* record);

// True, or false with NullPointerException("<simple class name> is null") pending.
bool requireObject(JNIEnv* env, jobject object, const char* className);

// The simple name of a JNI class name: "android/DVB/Cfg$ANT_Status" -> "ANT_Status".
const char* simpleName(const char* className);

template <size_t N>
bool readFields(JNIEnv* env, jobject object, const char* className, const JavaField (&map)[N],
                void* record) {
    if (!requireObject(env, object, className)) return false;
    FieldIds ids;
    return ids.lookup(env, className, map) &&
           readRecord(env, object, className, map, ids, N, record);
}

template <size_t N>
bool writeFields(JNIEnv* env, jobject object, const char* className, const JavaField (&map)[N],
                 const void* record) {
    if (!requireObject(env, object, className)) return false;
    FieldIds ids;
    return ids.lookup(env, className, map) && writeRecord(env, object, map, ids, N, record);
}

}  // namespace dvbjni
