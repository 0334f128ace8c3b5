#include "android_runtime/AndroidRuntime.h"

#include <dlfcn.h>
#include <nativehelper/JNIHelp.h>

#include <atomic>

namespace android {

int AndroidRuntime::registerNativeMethods(JNIEnv* env, const char* className,
                                          const JNINativeMethod* gMethods, int numMethods) {
    return jniRegisterNativeMethods(env, className, gMethods, numMethods);
}

JavaVM* AndroidRuntime::getJavaVM() {
    // On the device the runtime owns the VM. Here the VM is whichever JVM loaded us: its
    // invocation interface is already in the process, so it is looked up rather than linked.
    static std::atomic<JavaVM*> sVm{nullptr};
    JavaVM* vm = sVm.load(std::memory_order_acquire);
    if (vm != nullptr) return vm;
    using GetCreatedVMs = jint (*)(JavaVM**, jsize, jsize*);
    auto getCreated = reinterpret_cast<GetCreatedVMs>(dlsym(RTLD_DEFAULT, "JNI_GetCreatedJavaVMs"));
    if (getCreated == nullptr) return nullptr;
    jsize count = 0;
    if (getCreated(&vm, 1, &count) != JNI_OK || count < 1) return nullptr;
    sVm.store(vm, std::memory_order_release);
    return vm;
}

JNIEnv* AndroidRuntime::getJNIEnv() {
    JavaVM* vm = getJavaVM();
    if (vm == nullptr) return nullptr;
    JNIEnv* env = nullptr;
    if (vm->GetEnv(reinterpret_cast<void**>(&env), JNI_VERSION_1_4) != JNI_OK) return nullptr;
    return env;
}

}  // namespace android
