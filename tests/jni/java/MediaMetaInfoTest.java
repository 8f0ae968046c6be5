import com.velorana.android.mediametainfo.MediaMetaInfo;
import java.io.File;
import java.io.FileOutputStream;
import java.io.IOException;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.nio.file.Files;
import java.util.ArrayList;
import java.util.List;
import java.util.concurrent.atomic.AtomicInteger;

/**
 * Drives the Java binding in a real JVM.
 *
 * <p>Modes: "binding" (the methods themselves), "noclass" (the class is missing when the library
 * loads) and "nomethods" (the class lacks the native methods).
 */
public final class MediaMetaInfoTest {
    private static final String NODEFINE = "MediaInfo_NODEFINE";
    private static int passed;
    private static int failed;

    public static void main(String[] args) throws Exception {
        String mode = args.length > 0 ? args[0] : "binding";
        LogCapture.install();
        if (mode.equals("binding")) {
            System.loadLibrary("metainfo");
            bindingChecks();
        } else {
            registrationChecks(mode);
        }
        System.out.println(passed + " passed, " + failed + " failed");
        System.exit(failed == 0 ? 0 : 1);
    }

    private static void check(boolean ok, String what) {
        if (ok) {
            passed++;
        } else {
            failed++;
            System.out.println("FAILED: " + what);
        }
    }

    private static void checkEquals(Object expected, Object actual, String what) {
        check(expected == null ? actual == null : expected.equals(actual),
                what + ": expected <" + expected + "> got <" + actual + ">");
    }

    private static void registrationChecks(String mode) {
        Throwable thrown = null;
        try {
            System.loadLibrary("metainfo");
        } catch (Throwable t) {
            thrown = t;
        }
        check(thrown != null, mode + ": loading fails when registration fails");
        String log = LogCapture.drain();
        // The messages end in a newline of their own; the capture adds one per line.
        String first = mode.equals("noclass")
                ? "6|MetaInfo_JNI|find class failed : com/velorana/android/mediametainfo/MediaMetaInfo\n\n"
                : "6|MetaInfo_JNI|RegisterNatives failed\n\n";
        checkEquals(first + "6|MetaInfo_JNI|register natives failed \n\n", log, mode + ": log lines");
    }

    private static byte[] wavePcm() {
        int dataBytes = 8000;
        ByteBuffer b = ByteBuffer.allocate(44 + dataBytes).order(ByteOrder.LITTLE_ENDIAN);
        b.put("RIFF".getBytes()).putInt(36 + dataBytes).put("WAVE".getBytes());
        b.put("fmt ".getBytes()).putInt(16).putShort((short) 1).putShort((short) 1);
        b.putInt(8000).putInt(16000).putShort((short) 2).putShort((short) 16);
        b.put("data".getBytes()).putInt(dataBytes);
        return b.array();
    }

    private static byte[] amrNarrowBand() {
        byte[] head = "#!AMR\n".getBytes();
        byte[] out = new byte[head.length + 50 * 32];
        System.arraycopy(head, 0, out, 0, head.length);
        for (int i = 0; i < 50; i++) {
            out[head.length + i * 32] = 0x3C;
        }
        return out;
    }

    private static String write(File dir, String name, byte[] bytes) throws IOException {
        File f = new File(dir, name);
        try (FileOutputStream out = new FileOutputStream(f)) {
            out.write(bytes);
        }
        return f.getPath();
    }

    private interface Action {
        void run() throws Exception;
    }

    private static Class<?> thrownBy(Action r) {
        try {
            r.run();
        } catch (Throwable t) {
            return t.getClass();
        }
        return null;
    }

    private static void bindingChecks() throws Exception {
        File dir = Files.createTempDirectory("metainfo-jni").toFile();
        dir.deleteOnExit();
        String wav = write(dir, "tone.wav", wavePcm());
        String amr = write(dir, "voice.amr", amrNarrowBand());
        String unknown = write(dir, "noise.bin", new byte[200]);
        String tiny = write(dir, "tiny.bin", new byte[10]);
        for (String p : new String[] {wav, amr, unknown, tiny}) {
            new File(p).deleteOnExit();
        }
        LogCapture.drain();

        MediaMetaInfo fresh = new MediaMetaInfo();
        try {
            fresh.GetMediaMetaInfo(0);
            check(false, "no extractor: IOException expected");
        } catch (IOException e) {
            checkEquals("No extractor available", e.getMessage(), "no extractor message");
        }

        MediaMetaInfo info = new MediaMetaInfo();
        info.setFileSource(wav);
        long first = info.nativeContext();
        check(first != 0, "setFileSource stores an adapter");
        checkEquals("CODEC_WAVE_PCM  ", info.GetMediaMetaInfo(0), "WAVE PCM audio codec");
        checkEquals(NODEFINE, info.GetMediaMetaInfo(2), "WAVE has no video codec");
        checkEquals(IllegalArgumentException.class, thrownBy(() -> info.GetMediaMetaInfo(4)), "key 4");
        checkEquals(IllegalArgumentException.class, thrownBy(() -> info.GetMediaMetaInfo(-1)), "key -1");
        checkEquals(IllegalArgumentException.class, thrownBy(() -> info.setFileSource(null)), "null path");

        info.setFileSource(amr);
        check(info.nativeContext() != 0 && info.nativeContext() != first, "a second file replaces the adapter");
        checkEquals(NODEFINE, info.GetMediaMetaInfo(0), "AMR narrow-band codec query fails");
        checkEquals("", LogCapture.drain(), "detected files log nothing");

        info.setFileSource(unknown);
        checkEquals(NODEFINE, info.GetMediaMetaInfo(0), "unknown content");
        String missing = new File(dir, "missing.mp3").getPath();
        info.setFileSource(missing);
        info.setFileSource(tiny);
        checkEquals("6|(null)|MP_MetaInfo_Adapter: invalid media type: " + missing + "\n"
                + "6|(null)|MP_MetaInfo_Adapter: invalid media type: " + tiny + "\n",
                LogCapture.drain(), "undetectable files are logged");
        checkEquals(NODEFINE, info.GetMediaMetaInfo(1), "undetectable file answers");

        info.Release();
        checkEquals(0L, info.nativeContext(), "Release clears the context");
        boolean threwIo = false;
        try {
            info.GetMediaMetaInfo(0);
        } catch (IOException e) {
            threwIo = true;
        }
        check(threwIo, "a released object has no extractor");
        info.Release();

        threadChecks(wav, amr);
    }

    private static void threadChecks(String wav, String amr) throws InterruptedException {
        AtomicInteger wrong = new AtomicInteger();
        List<Thread> threads = new ArrayList<>();
        for (int t = 0; t < 8; t++) {
            final boolean useWave = t % 2 == 0;
            Thread th = new Thread(() -> {
                MediaMetaInfo m = new MediaMetaInfo();
                for (int i = 0; i < 50; i++) {
                    m.setFileSource(useWave ? wav : amr);
                    try {
                        String codec = m.GetMediaMetaInfo(0);
                        if (!codec.equals(useWave ? "CODEC_WAVE_PCM  " : NODEFINE)) {
                            wrong.incrementAndGet();
                        }
                    } catch (IOException e) {
                        wrong.incrementAndGet();
                    }
                }
                m.Release();
            });
            threads.add(th);
            th.start();
        }
        for (Thread th : threads) {
            th.join();
        }
        checkEquals(0, wrong.get(), "answers stay right with eight threads at once");
    }
}
