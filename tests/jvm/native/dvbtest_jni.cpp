// Test-only JNI library: lets the JVM tests drive the spy service, read the lines that
// libDVBjni writes to the Android log, and watch the JNI global references it makes.
// It is loaded before libDVBjni so that the log capture sees the library's load.
#include <DVB.h>
#include <android/log.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/scoped_local_ref.h>
#include <nativehelper/scoped_primitive_array.h>
#include <nativehelper/scoped_utf_chars.h>
#include <spy/Spy.h>

#include <dlfcn.h>
#include <link.h>
#include <pthread.h>

#include <cstdio>
#include <cstring>
#include <mutex>
#include <string>
#include <type_traits>
#include <vector>

namespace {

std::mutex gLock;
std::vector<std::string> gLogs;
std::vector<std::string> gRefEvents;

void captureLog(const __android_logger_data* data, const char* message) {
    // DVB objects that earlier tests left to the garbage collector log their release from the
    // VM's finalizer thread at moments no test controls: those lines are not captured.
    char thread[16] = "";
    pthread_getname_np(pthread_self(), thread, sizeof thread);
    if (strcmp(thread, "Finalizer") == 0) return;
    char head[64];
    snprintf(head, sizeof head, "%d ", data->priority);
    std::string line = std::string(head) + (data->tag != nullptr ? data->tag : "") + " " + message;
    std::lock_guard<std::mutex> lock(gLock);
    gLogs.push_back(std::move(line));
}

// ---- global reference tracking ----------------------------------------------------------
// A copy of a thread's JNI function table with NewGlobalRef and DeleteGlobalRef wrapped. It
// is installed on the thread that loads this library (the test thread) and on every service
// thread as it attaches; other Java threads are not watched.
JNINativeInterface gHooked;
const JNINativeInterface* gOriginal = nullptr;
jclass gClassClass = nullptr;

void noteRef(JNIEnv* env, const char* what, jobject ref) {
    bool isClass = gOriginal->IsInstanceOf(env, ref, gClassClass);
    std::lock_guard<std::mutex> lock(gLock);
    gRefEvents.push_back(std::string(what) + (isClass ? " class" : " object"));
}

jobject JNICALL hookedNewGlobalRef(JNIEnv* env, jobject obj) {
    noteRef(env, "new", obj);
    return gOriginal->NewGlobalRef(env, obj);
}

void JNICALL hookedDeleteGlobalRef(JNIEnv* env, jobject ref) {
    if (ref != nullptr) noteRef(env, "delete", ref);
    gOriginal->DeleteGlobalRef(env, ref);
}

void trackGlobalRefs(JNIEnv* env) {
    ScopedLocalRef<jclass> cls(env, env->FindClass("java/lang/Class"));
    gClassClass = static_cast<jclass>(env->NewGlobalRef(cls.get()));
    gOriginal = env->functions;
    gHooked = *env->functions;
    gHooked.NewGlobalRef = hookedNewGlobalRef;
    gHooked.DeleteGlobalRef = hookedDeleteGlobalRef;
    dvbspy::setAttachHook([](JNIEnv* attached) { attached->functions = &gHooked; });
    env->functions = &gHooked;
}

// Whether 0 <= i < n; if not, an IndexOutOfBoundsException for Java.
bool inRange(JNIEnv* env, const char* what, jint i, size_t n) {
    if (i >= 0 && static_cast<size_t>(i) < n) return true;
    jniThrowExceptionFmt(env, "java/lang/IndexOutOfBoundsException", "%s %d of %zu", what, i, n);
    return false;
}

jbyteArray toBytes(JNIEnv* env, const void* data, size_t size) {
    jbyteArray a = env->NewByteArray(static_cast<jsize>(size));
    if (a != nullptr)
        env->SetByteArrayRegion(a, 0, static_cast<jsize>(size), static_cast<const jbyte*>(data));
    return a;
}

jlongArray toLongs(JNIEnv* env, const std::vector<jlong>& v) {
    jlongArray a = env->NewLongArray(static_cast<jsize>(v.size()));
    if (a != nullptr) env->SetLongArrayRegion(a, 0, static_cast<jsize>(v.size()), v.data());
    return a;
}

// The elements of a Java array of byte arrays or strings, or false (an exception pending).
template <typename T>
bool elements(JNIEnv* env, jobjectArray array, std::vector<T>& out) {
    for (jsize i = 0, n = env->GetArrayLength(array); i < n; ++i) {
        ScopedLocalRef<jobject> e(env, env->GetObjectArrayElement(array, i));
        if constexpr (std::is_same_v<T, std::string>) {
            ScopedUtfChars s(env, static_cast<jstring>(e.get()));
            if (s.c_str() == nullptr) return false;
            out.emplace_back(s.c_str());
        } else {
            ScopedByteArrayRO b(env, static_cast<jbyteArray>(e.get()));
            if (b.get() == nullptr) return false;
            const auto* p = reinterpret_cast<const uint8_t*>(b.get());
            out.emplace_back(p, p + b.size());
        }
    }
    return true;
}

// Hands the lines of `from` to Java and forgets them.
jobjectArray take(JNIEnv* env, std::vector<std::string>& from) {
    std::vector<std::string> lines;
    {
        std::lock_guard<std::mutex> lock(gLock);
        lines.swap(from);
    }
    ScopedLocalRef<jclass> stringClass(env, env->FindClass("java/lang/String"));
    jobjectArray a =
            env->NewObjectArray(static_cast<jsize>(lines.size()), stringClass.get(), nullptr);
    for (size_t i = 0; a != nullptr && i < lines.size(); ++i) {
        ScopedLocalRef<jstring> s(env, env->NewStringUTF(lines[i].c_str()));
        env->SetObjectArrayElement(a, static_cast<jsize>(i), s.get());
    }
    return a;
}

// What the loaded libDVBjni exports as `name`, or null. The library stays loaded for the
// process, as the VM never unloads it.
void* exported(const char* name) {
    void* lib = dlopen("libDVBjni.so", RTLD_NOW | RTLD_NOLOAD);
    void* sym = lib != nullptr ? dlsym(lib, name) : nullptr;
    if (lib != nullptr) dlclose(lib);
    return sym;
}

}  // namespace

// ---- natives of android.DVB.Spy, which the VM finds by their names ------------------------
extern "C" {

JNIEXPORT void JNICALL Java_android_DVB_Spy_reset(JNIEnv*, jclass) {
    dvbspy::reset();
    std::lock_guard<std::mutex> lock(gLock);
    gLogs.clear();
    gRefEvents.clear();
}

JNIEXPORT jint JNICALL Java_android_DVB_Spy_callCount(JNIEnv*, jclass) {
    return static_cast<jint>(dvbspy::callCount());
}

JNIEXPORT jstring JNICALL Java_android_DVB_Spy_op(JNIEnv* env, jclass, jint i) {
    auto calls = dvbspy::calls();
    return inRange(env, "call", i, calls.size()) ? env->NewStringUTF(calls[i].op.c_str()) : nullptr;
}

JNIEXPORT jlongArray JNICALL Java_android_DVB_Spy_args(JNIEnv* env, jclass, jint i) {
    auto calls = dvbspy::calls();
    if (!inRange(env, "call", i, calls.size())) return nullptr;
    return toLongs(env, std::vector<jlong>(calls[i].args.begin(), calls[i].args.end()));
}

JNIEXPORT jbyteArray JNICALL Java_android_DVB_Spy_record(JNIEnv* env, jclass, jint i, jint r) {
    auto calls = dvbspy::calls();
    if (!inRange(env, "call", i, calls.size())) return nullptr;
    const auto& records = calls[i].records;
    if (!inRange(env, "record", r, records.size())) return nullptr;
    return toBytes(env, records[r].data(), records[r].size());
}

JNIEXPORT jlong JNICALL Java_android_DVB_Spy_owner(JNIEnv* env, jclass, jint i) {
    auto calls = dvbspy::calls();
    return inRange(env, "call", i, calls.size()) ? reinterpret_cast<uintptr_t>(calls[i].owner) : 0;
}

JNIEXPORT void JNICALL Java_android_DVB_Spy_setResult(JNIEnv* env, jclass, jstring op,
                                                      jint result) {
    ScopedUtfChars name(env, op);
    if (name.c_str() != nullptr) dvbspy::setResult(name.c_str(), result);
}

JNIEXPORT void JNICALL Java_android_DVB_Spy_setOut(JNIEnv* env, jclass, jstring op, jint arg,
                                                   jint offset, jbyteArray bytes) {
    ScopedUtfChars name(env, op);
    ScopedByteArrayRO b(env, bytes);
    if (name.c_str() == nullptr || b.get() == nullptr) return;
    const auto* p = reinterpret_cast<const uint8_t*>(b.get());
    dvbspy::setOut(name.c_str(), arg, static_cast<size_t>(offset),
                   std::vector<uint8_t>(p, p + b.size()));
}

JNIEXPORT void JNICALL Java_android_DVB_Spy_setList(JNIEnv* env, jclass, jstring op,
                                                    jobjectArray nodes) {
    ScopedUtfChars name(env, op);
    std::vector<std::vector<uint8_t>> list;
    if (name.c_str() != nullptr && elements(env, nodes, list)) dvbspy::setList(name.c_str(), list);
}

JNIEXPORT void JNICALL Java_android_DVB_Spy_omit(JNIEnv* env, jclass, jobjectArray modules) {
    std::vector<std::string> names;
    if (elements(env, modules, names)) dvbspy::omitModules(names);
}

JNIEXPORT jlongArray JNICALL Java_android_DVB_Spy_liveDvbs(JNIEnv* env, jclass) {
    std::vector<jlong> v;
    for (const auto& dvb : dvbsvc::liveDvbs()) v.push_back(reinterpret_cast<uintptr_t>(dvb.get()));
    return toLongs(env, v);
}

// Strong references on the DVB object at `address`, not counting the one taken to ask; -1
// when no such object lives.
JNIEXPORT jint JNICALL Java_android_DVB_Spy_strongCount(JNIEnv*, jclass, jlong address) {
    for (const auto& dvb : dvbsvc::liveDvbs())
        if (static_cast<jlong>(reinterpret_cast<uintptr_t>(dvb.get())) == address)
            return dvb->getStrongCount() - 1;
    return -1;
}

JNIEXPORT jint JNICALL Java_android_DVB_Spy_liveListenerCount(JNIEnv*, jclass) {
    return static_cast<jint>(dvbsvc::liveListenerCount());
}

JNIEXPORT void JNICALL Java_android_DVB_Spy_raise(JNIEnv*, jclass, jint msg, jint ext1, jint ext2,
                                                  jint count, jint threads) {
    dvbspy::raiseEvents(msg, ext1, ext2, count, threads);
}

JNIEXPORT jobjectArray JNICALL Java_android_DVB_Spy_takeLogs(JNIEnv* env, jclass) {
    return take(env, gLogs);
}

JNIEXPORT jobjectArray JNICALL Java_android_DVB_Spy_takeGlobalRefEvents(JNIEnv* env, jclass) {
    return take(env, gRefEvents);
}

// What libDVBjni's exported entry points answer, -99 where one is not exported: JNI_OnLoad run
// once more in this VM (registration is idempotent; Java cannot see its result from
// System.loadLibrary), then the module callbacks Strmcallback and Subttlcallback.
JNIEXPORT jintArray JNICALL Java_android_DVB_Spy_entryPoints(JNIEnv* env, jclass) {
    jint got[3] = {-99, -99, -99};
    JavaVM* vm = nullptr;
    env->GetJavaVM(&vm);
    if (auto onLoad = reinterpret_cast<jint (*)(JavaVM*, void*)>(exported("JNI_OnLoad")))
        got[0] = onLoad(vm, nullptr);
    const char* callbacks[] = {"_Z12StrmcallbackPvii", "_Z14SubttlcallbackPvii"};
    for (int i = 0; i < 2; ++i) {
        auto fn = reinterpret_cast<int (*)(void*, int, int)>(exported(callbacks[i]));
        if (fn != nullptr) got[i + 1] = fn(&got, -1, 7);
    }
    jintArray a = env->NewIntArray(3);
    if (a != nullptr) env->SetIntArrayRegion(a, 0, 3, got);
    return a;
}

// Entry `index` of the cache that libDVBjni exports as `symbol`, `size` bytes per entry; null
// when the library exports no such name or the entry lies outside the exported object.
JNIEXPORT jbyteArray JNICALL Java_android_DVB_Spy_cacheEntry(JNIEnv* env, jclass, jstring symbol,
                                                             jint index, jint size) {
    ScopedUtfChars name(env, symbol);
    if (name.c_str() == nullptr || index < 0 || size <= 0) return nullptr;
    const auto* base = static_cast<const uint8_t*>(exported(name.c_str()));
    Dl_info info;
    ElfW(Sym)* sym = nullptr;
    bool found = base != nullptr &&
                 dladdr1(base, &info, reinterpret_cast<void**>(&sym), RTLD_DL_SYMENT) != 0 &&
                 sym != nullptr;
    if (!found || (int64_t{index} + 1) * size > static_cast<int64_t>(sym->st_size)) return nullptr;
    return toBytes(env, base + int64_t{index} * size, size);
}

jint JNI_OnLoad(JavaVM* vm, void*) {
    // The suites measure the library against the spy's exact behaviour, whatever the
    // substitute service's default.
    dvbsvc::setBackend(&dvbspy::backend());
    __android_log_set_logger(captureLog);
    __android_log_set_minimum_priority(ANDROID_LOG_VERBOSE);
    JNIEnv* env = nullptr;
    if (vm->GetEnv(reinterpret_cast<void**>(&env), JNI_VERSION_1_4) != JNI_OK) return -1;
    // Without the Spy class (the load-failure checks) only the log capture is wanted.
    ScopedLocalRef<jclass> spy(env, env->FindClass("android/DVB/Spy"));
    if (spy.get() != nullptr) trackGlobalRefs(env);
    env->ExceptionClear();
    return JNI_VERSION_1_4;
}

// Lets a load-failure check read the captured lines without the Spy class.
JNIEXPORT jobjectArray JNICALL Java_dvbtest_LoadCheck_takeLogs(JNIEnv* env, jclass) {
    return take(env, gLogs);
}

}  // extern "C"
