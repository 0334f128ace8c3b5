package android.DVB;

import java.lang.ref.WeakReference;

/**
 * Entry point of the DVB receiver API: binds one native DVB service object,
 * delivers its events and hands out the module objects.
 */
public class DVB {
    static {
        System.loadLibrary("DVBjni");
        native_init();
    }

    /** Address of the bound native DVB object, or 0; written only by the native layer. */
    private int mNativeContext;

    private volatile OnEventListener mOnEventListener;

    /** Receives the events that the DVB service raises on its own threads. */
    public interface OnEventListener {
        /**
         * Called on a service thread for every event.
         *
         * @param dvb  the DVB object the event belongs to
         * @param msg  event code, defined by the DVB service
         * @param ext1 first event argument
         * @param ext2 second event argument
         * @param obj  additional data; currently always null
         */
        void onEvent(DVB dvb, int msg, int ext1, int ext2, Object obj);
    }

    /** Creates a native DVB service object and binds it to this object. */
    public DVB() {
        native_setup(new WeakReference<DVB>(this));
    }

    /**
     * Registers the listener for service events.
     *
     * @param l the listener, or null to stop receiving events
     */
    public void setOnEventListener(OnEventListener l) {
        mOnEventListener = l;
    }

    /** Returns the native context that module objects copy. */
    int nativeContext() {
        return mNativeContext;
    }

    /** @return a new scan module object bound to this DVB object */
    public Scnm getScnm() {
        return new Scnm(mNativeContext);
    }

    /** @return a new stream module object bound to this DVB object */
    public Strm getStrm() {
        return new Strm(mNativeContext);
    }

    /** @return a new configuration module object bound to this DVB object */
    public Cfg getCfg() {
        return new Cfg(mNativeContext);
    }

    /** @return a new subtitle module object bound to this DVB object */
    public Subttl getSubttl() {
        return new Subttl(mNativeContext);
    }

    /** @return a new teletext module object bound to this DVB object */
    public Teltxt getTeltxt() {
        return new Teltxt(mNativeContext);
    }

    /**
     * Unbinds and releases the native DVB object; safe to call more than once.
     * Module objects obtained earlier must not be used afterwards.
     */
    public void release() {
        native_release();
    }

    @SuppressWarnings("deprecation")
    @Override
    protected void finalize() {
        native_finalize();
    }

    /**
     * Called by the native layer on service threads.
     *
     * @param ref the weak reference given to native_setup
     */
    private static void postEventFromNative(Object ref, int msg, int ext1, int ext2, Object obj) {
        if (!(ref instanceof WeakReference)) {
            return;
        }
        Object target = ((WeakReference<?>) ref).get();
        if (!(target instanceof DVB)) {
            return;
        }
        DVB dvb = (DVB) target;
        OnEventListener l = dvb.mOnEventListener;
        if (l == null) {
            return;
        }
        try {
            l.onEvent(dvb, msg, ext1, ext2, obj);
        } catch (RuntimeException | Error e) {
            // A listener's failure must not stay pending on the service's thread, where no
            // Java code could ever see it: hand it to the thread's uncaught-exception handler.
            Thread t = Thread.currentThread();
            t.getUncaughtExceptionHandler().uncaughtException(t, e);
        }
    }

    private static native void native_init();

    private native void native_setup(Object eventTarget);

    private native void native_finalize();

    private native void native_release();
}
