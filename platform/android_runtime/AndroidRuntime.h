// Host stand-in for the Android runtime's AndroidRuntime class: the three static services that
// native libraries of the platform use. Debian does not package the real one.
#pragma once

#include <nativehelper/jni.h>

namespace android {

class AndroidRuntime {
public:
    // Registers `numMethods` natives of `className`. As on the device, a table entry that the
    // class does not declare aborts the process; a missing class does too.
    static int registerNativeMethods(JNIEnv* env, const char* className,
                                     const JNINativeMethod* gMethods, int numMethods);

    // The Java VM of this process, or null when no VM runs in it.
    static JavaVM* getJavaVM();

    // The Java environment of the calling thread, or null when the thread is not attached.
    static JNIEnv* getJNIEnv();
};

}  // namespace android
