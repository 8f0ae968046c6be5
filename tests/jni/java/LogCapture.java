/** Collects the library's log lines through its log sink (a small native test helper). */
public final class LogCapture {
    static {
        System.loadLibrary("metainfo_logcapture");
    }

    private LogCapture() {}

    /** Installs the sink; lines are kept until drained. */
    public static native void install();

    /** Returns the lines logged since the last call, each as "priority|tag|message\n". */
    public static native String drain();
}
