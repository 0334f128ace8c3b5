#include "Fields.h"

#include <nativehelper/scoped_local_ref.h>

#include <cstdio>
#include <cstring>

#include "Errors.h"
#include "Text.h"

namespace dvbjni {

const char* simpleName(const char* className) {
    const char* name = className;
    for (const char* p = className; *p != '\0'; ++p) {
        if (*p == '/' || *p == '$') name = p + 1;
    }
    return name;
}

bool requireObject(JNIEnv* env, jobject object, const char* className) {
    if (object != nullptr) return true;
    throwNull(env, simpleName(className));
    return false;
}

bool FieldIds::lookup(JNIEnv* env, const char* className, const JavaField* map, size_t count) {
    ScopedLocalRef<jclass> cls(env, env->FindClass(className));
    return cls.get() != nullptr && lookup(env, cls.get(), map, count);
}

bool FieldIds::lookup(JNIEnv* env, jclass cls, const JavaField* map, size_t count) {
    for (size_t i = 0; i < count; ++i) {
        mIds[i] = env->GetFieldID(cls, map[i].name, map[i].signature);
        if (mIds[i] == nullptr) return false;
    }
    return true;
}

namespace {

template <typename T>
T load(const uint8_t* p) {
    T v;
    memcpy(&v, p, sizeof v);
    return v;
}

template <typename T>
void store(uint8_t* p, T v) {
    memcpy(p, &v, sizeof v);
}

}  // namespace

bool readRecord(JNIEnv* env, jobject object, const char* className, const JavaField* map,
                const FieldIds& ids, size_t count, void* record) {
    auto* base = static_cast<uint8_t*>(record);
    for (size_t i = 0; i < count; ++i) {
        const JavaField& f = map[i];
        uint8_t* p = base + f.offset;
        switch (f.conv) {
            case Conv::Int32:
                store<int32_t>(p, env->GetIntField(object, ids[i]));
                break;
            case Conv::UInt8:
                store<uint8_t>(p, static_cast<uint8_t>(env->GetIntField(object, ids[i])));
                break;
            case Conv::UInt16:
            case Conv::Int16:
                store<uint16_t>(p, static_cast<uint16_t>(env->GetIntField(object, ids[i])));
                break;
            case Conv::UInt32Long:
                store<uint32_t>(p, static_cast<uint32_t>(env->GetLongField(object, ids[i])));
                break;
            case Conv::Int64:
                store<int64_t>(p, env->GetLongField(object, ids[i]));
                break;
            case Conv::Text:
            case Conv::TextOrNull:
            case Conv::LangCode:
            case Conv::LangCodeOr: {
                // A longer text is cut at the field's end; a language code keeps three bytes
                // and the zero that the cleared record already holds.
                ScopedLocalRef<jstring> s(
                        env, static_cast<jstring>(env->GetObjectField(object, ids[i])));
                if (s.get() == nullptr) {
                    if (f.conv == Conv::LangCodeOr) break;  // the record's default stands
                    char what[96];
                    snprintf(what, sizeof what, "%s.%s", simpleName(className), f.name);
                    throwNull(env, what);
                    return false;
                }
                bool code = f.conv == Conv::LangCode || f.conv == Conv::LangCodeOr;
                size_t limit = code ? 3 : f.width;
                if (code) memset(p, 0, 3);  // a shorter code leaves zeros, not the default
                if (copyStringBytes(env, s.get(), reinterpret_cast<char*>(p), limit, f.name) < 0) {
                    return false;
                }
                break;
            }
            case Conv::Bytes:
            case Conv::AllBytes:
                break;  // byte arrays only travel toward Java
        }
    }
    return true;
}

bool writeRecord(JNIEnv* env, jobject object, const JavaField* map, const FieldIds& ids,
                 size_t count, const void* record) {
    const auto* base = static_cast<const uint8_t*>(record);
    for (size_t i = 0; i < count; ++i) {
        const JavaField& f = map[i];
        const uint8_t* p = base + f.offset;
        const char* text = reinterpret_cast<const char*>(p);
        switch (f.conv) {
            case Conv::Int32:
                env->SetIntField(object, ids[i], load<int32_t>(p));
                break;
            case Conv::UInt8:
                env->SetIntField(object, ids[i], load<uint8_t>(p));
                break;
            case Conv::UInt16:
                env->SetIntField(object, ids[i], load<uint16_t>(p));
                break;
            case Conv::Int16:
                env->SetIntField(object, ids[i], load<int16_t>(p));
                break;
            case Conv::UInt32Long:
                env->SetLongField(object, ids[i], static_cast<jlong>(load<uint32_t>(p)));
                break;
            case Conv::Int64:
                env->SetLongField(object, ids[i], load<int64_t>(p));
                break;
            case Conv::TextOrNull:
                if (text[0] == '\0') {
                    env->SetObjectField(object, ids[i], nullptr);
                    break;
                }
                [[fallthrough]];
            case Conv::Text:
            case Conv::LangCode:
            case Conv::LangCodeOr: {
                ScopedLocalRef<jstring> s(env, newStringFromField(env, text, f.width));
                if (s.get() == nullptr) return false;
                env->SetObjectField(object, ids[i], s.get());
                break;
            }
            case Conv::Bytes:
            case Conv::AllBytes: {
                size_t n = f.conv == Conv::Bytes ? fieldLength(text, f.width) : f.width;
                ScopedLocalRef<jbyteArray> a(env, newByteArray(env, p, n));
                if (a.get() == nullptr) return false;
                env->SetObjectField(object, ids[i], a.get());
                break;
            }
        }
    }
    return true;
}

}  // namespace dvbjni
