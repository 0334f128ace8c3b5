package android.DVB;

/** The test side of the spy service: calls, scripts, reference counts, log lines. */
final class Spy {
    static {
        // Before libDVBjni, so that the log capture sees its load.
        System.loadLibrary("dvbtest");
    }

    static native void reset();
    static native int callCount();
    static native String op(int call);
    static native long[] args(int call);
    static native byte[] record(int call, int record);
    static native long owner(int call);
    static native void setResult(String op, int result);
    static native void setOut(String op, int arg, int offset, byte[] bytes);
    static native void setList(String op, byte[][] nodes);
    static native void omit(String[] modules);
    static native long[] liveDvbs();
    static native int strongCount(long dvb);
    static native int liveListenerCount();
    static native void raise(int msg, int ext1, int ext2, int count, int threads);
    static native String[] takeLogs();
    static native String[] takeGlobalRefEvents();
    static native int[] entryPoints();
    static native byte[] cacheEntry(String symbol, int index, int size);
}
