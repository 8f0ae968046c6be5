// The Java binding driven through a JNI environment of the test's own, so that
// its native side also runs under the sanitizers (a JVM will not load them).
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "jni/media_meta_info_jni.h"
#include "metainfo/metainfo.h"
#include "support/bytes.h"

using namespace metainfo;
using testing_support::Bytes;
using testing_support::TempDir;

namespace {

struct FakeObject {
    bool hasField = true;
    jlong context = 0;
};

// One fake JVM at a time; the JNI function table is plain C, so it reaches
// the fake through this pointer.
struct FakeJvm;
FakeJvm* g_jvm = nullptr;

struct FakeJvm {
    JNINativeInterface_ functions{};
    JNIEnv env{};
    JNIInvokeInterface_ vmFunctions{};
    JavaVM vm{};

    bool classExists = true;
    bool envAvailable = true;
    jint registerResult = 0;
    std::vector<std::string> registered;
    std::vector<std::string> classNames;  // FindClass results live here
    std::vector<std::unique_ptr<std::string>> strings;
    std::string thrownClass;
    std::string thrownMessage;
    bool thrownWithMessage = false;
    int throws = 0;
    bool failStringChars = false;
    bool outOfMemory = false;  // failing calls leave an OutOfMemoryError pending
    // The exception pending in the native method; Java receives it on return.
    std::string pending;

    // A JVM's rule: with an exception pending, only the exception and release
    // functions may be called.
    static void Enter(const char* function) {
        if (!g_jvm->pending.empty()) ADD_FAILURE() << function << " called with " << g_jvm->pending << " pending";
    }
    static void Raise(const std::string& cls) { g_jvm->pending = cls; }

    FakeJvm() {
        classNames.reserve(64);
        functions.FindClass = [](JNIEnv*, const char* name) -> jclass {
            Enter("FindClass");
            std::string n = name;
            if (n == "com/velorana/android/mediametainfo/MediaMetaInfo" && !g_jvm->classExists) {
                Raise("java/lang/NoClassDefFoundError");
                return nullptr;
            }
            g_jvm->classNames.push_back(n);
            return reinterpret_cast<jclass>(&g_jvm->classNames.back());
        };
        functions.ThrowNew = [](JNIEnv*, jclass cls, const char* message) -> jint {
            Enter("ThrowNew");
            Raise(*reinterpret_cast<std::string*>(cls));
            g_jvm->thrownClass = *reinterpret_cast<std::string*>(cls);
            g_jvm->thrownWithMessage = message != nullptr;
            g_jvm->thrownMessage = message != nullptr ? message : "";
            ++g_jvm->throws;
            return 0;
        };
        functions.ExceptionCheck = [](JNIEnv*) -> jboolean { return g_jvm->pending.empty() ? JNI_FALSE : JNI_TRUE; };
        functions.ExceptionClear = [](JNIEnv*) { g_jvm->pending.clear(); };
        functions.GetObjectClass = [](JNIEnv*, jobject) -> jclass {
            Enter("GetObjectClass");
            static std::string cls = "MediaMetaInfo";
            return reinterpret_cast<jclass>(&cls);
        };
        functions.GetFieldID = [](JNIEnv*, jclass, const char* name, const char* sig) -> jfieldID {
            (void)name;
            (void)sig;
            return nullptr;  // replaced per object below
        };
        functions.GetLongField = [](JNIEnv*, jobject obj, jfieldID) -> jlong {
            Enter("GetLongField");
            return reinterpret_cast<FakeObject*>(obj)->context;
        };
        functions.SetLongField = [](JNIEnv*, jobject obj, jfieldID, jlong value) {
            Enter("SetLongField");
            reinterpret_cast<FakeObject*>(obj)->context = value;
        };
        functions.GetStringUTFChars = [](JNIEnv*, jstring s, jboolean*) -> const char* {
            Enter("GetStringUTFChars");
            if (g_jvm->failStringChars) {
                if (g_jvm->outOfMemory) Raise("java/lang/OutOfMemoryError");
                return nullptr;
            }
            return reinterpret_cast<std::string*>(s)->c_str();
        };
        functions.ReleaseStringUTFChars = [](JNIEnv*, jstring, const char*) {};
        functions.NewStringUTF = [](JNIEnv*, const char* text) -> jstring {
            Enter("NewStringUTF");
            if (g_jvm->outOfMemory) {
                Raise("java/lang/OutOfMemoryError");
                return nullptr;
            }
            g_jvm->strings.push_back(std::make_unique<std::string>(text));
            return reinterpret_cast<jstring>(g_jvm->strings.back().get());
        };
        functions.RegisterNatives = [](JNIEnv*, jclass, const JNINativeMethod* methods, jint n) -> jint {
            Enter("RegisterNatives");
            for (jint i = 0; i < n; ++i) {
                g_jvm->registered.push_back(std::string(methods[i].name) + methods[i].signature);
            }
            if (g_jvm->registerResult < 0) Raise("java/lang/NoSuchMethodError");
            return g_jvm->registerResult;
        };
        env.functions = &functions;
        vmFunctions.GetEnv = [](JavaVM*, void** out, jint version) -> jint {
            if (!g_jvm->envAvailable || version != 0x10006) return JNI_EVERSION;
            *out = &g_jvm->env;
            return JNI_OK;
        };
        vm.functions = &vmFunctions;
        g_jvm = this;
    }
    ~FakeJvm() { g_jvm = nullptr; }
};

// The field lookup answers by object: an object may lack mNativeContext.
FakeObject* g_currentObject = nullptr;
jfieldID FieldFor(JNIEnv*, jclass, const char* name, const char* sig) {
    static int token;
    FakeJvm::Enter("GetFieldID");
    if (g_currentObject == nullptr || !g_currentObject->hasField || std::string(name) != "mNativeContext" ||
        std::string(sig) != "J") {
        FakeJvm::Raise("java/lang/NoSuchFieldError");
        return nullptr;
    }
    return reinterpret_cast<jfieldID>(&token);
}

std::vector<std::string> g_log;
void CaptureLog(int priority, const char* tag, const char* message) {
    g_log.push_back(std::to_string(priority) + "|" + (tag != nullptr ? tag : "(null)") + "|" + message);
}

class Binding : public ::testing::Test {
protected:
    void SetUp() override {
        jvm.functions.GetFieldID = FieldFor;
        g_currentObject = &object;
        g_log.clear();
        MM_MediaExtractor_SetLogSink(CaptureLog);
    }
    void TearDown() override {
        Release();
        MM_MediaExtractor_SetLogSink(nullptr);
        g_currentObject = nullptr;
    }

    jobject Self() { return reinterpret_cast<jobject>(&object); }
    jstring JavaString(const std::string& s) {
        jvm.strings.push_back(std::make_unique<std::string>(s));
        return reinterpret_cast<jstring>(jvm.strings.back().get());
    }
    // Each native method is called as Java would: the exception it leaves
    // pending is what Java receives, and is no longer pending afterwards.
    void BackInJava() {
        raised = jvm.pending;
        jvm.pending.clear();
    }
    std::string Ask(jint key) {
        jstring s = Java_MediaMetaInfo_GetMediaMetaInfo(&jvm.env, Self(), key);
        BackInJava();
        return s != nullptr ? *reinterpret_cast<std::string*>(s) : "(null)";
    }
    void SetPath(jstring path) {
        Java_MediaMetaInfo_setFileSource(&jvm.env, Self(), path);
        BackInJava();
    }
    void SetFile(const std::string& path) { SetPath(JavaString(path)); }
    void Release() {
        Java_MediaMetaInfo_Release(&jvm.env, Self());
        BackInJava();
    }
    jint OnLoad() {
        jint version = JNI_OnLoad(&jvm.vm, nullptr);
        BackInJava();
        return version;
    }

    FakeJvm jvm;
    FakeObject object;
    TempDir dir;
    std::string raised;  // what the last native method left pending
};

}  // namespace

TEST_F(Binding, OnLoadRegistersTheThreeMethodsInOrder) {
    EXPECT_EQ(OnLoad(), 0x10004);
    EXPECT_EQ(jvm.registered, (std::vector<std::string>{"GetMediaMetaInfo(I)Ljava/lang/String;",
                                                        "setFileSource(Ljava/lang/String;)V", "Release()V"}));
    EXPECT_TRUE(g_log.empty());
}

TEST_F(Binding, OnLoadLogsAndGivesUpWhenRegistrationFails) {
    jvm.classExists = false;
    EXPECT_EQ(OnLoad(), 0);
    EXPECT_EQ(g_log, (std::vector<std::string>{
                         "6|MetaInfo_JNI|find class failed : com/velorana/android/mediametainfo/MediaMetaInfo\n",
                         "6|MetaInfo_JNI|register natives failed \n"}));
    g_log.clear();
    jvm.classExists = true;
    jvm.registerResult = -1;
    EXPECT_EQ(OnLoad(), 0);
    EXPECT_EQ(g_log, (std::vector<std::string>{"6|MetaInfo_JNI|RegisterNatives failed\n",
                                               "6|MetaInfo_JNI|register natives failed \n"}));
    jvm.envAvailable = false;
    EXPECT_EQ(OnLoad(), -1);
}

TEST_F(Binding, AskingBeforeAFileIsSetThrowsIOException) {
    EXPECT_EQ(Ask(0), "(null)");
    EXPECT_EQ(jvm.thrownClass, "java/io/IOException");
    EXPECT_EQ(jvm.thrownMessage, "No extractor available");
    object.hasField = false;
    EXPECT_EQ(Ask(0), "(null)");
    EXPECT_EQ(raised, "java/io/IOException") << "in place of the missing field's error";
    EXPECT_EQ(jvm.throws, 2);
}

TEST_F(Binding, KeysOutsideZeroToThreeThrowButStillAnswer) {
    SetFile(dir.Write("tune.mid", Bytes().str("MThd").be32(6).zeros(120)));
    for (jint key : {4, -1, 0x7FFFFFFF}) {
        EXPECT_EQ(Ask(key), "MediaInfo_NODEFINE") << key;
        EXPECT_EQ(raised, "java/lang/IllegalArgumentException");
        EXPECT_FALSE(jvm.thrownWithMessage);
    }
    jvm.throws = 0;
    for (jint key = 0; key <= 3; ++key) EXPECT_EQ(Ask(key), "MediaInfo_NODEFINE") << "MIDI has no codec query";
    EXPECT_EQ(jvm.throws, 0);
    jvm.outOfMemory = true;
    EXPECT_EQ(Ask(4), "(null)");
    EXPECT_EQ(raised, "java/lang/OutOfMemoryError") << "no answer to give beside the exception";
    EXPECT_EQ(jvm.throws, 0);
}

TEST_F(Binding, WavePcmIsNamedWithItsBlanks) {
    Bytes wave;
    wave.str("RIFF").le32(36 + 800).str("WAVE").str("fmt ").le32(16).le16(1).le16(1).le32(8000).le32(16000);
    wave.le16(2).le16(16).str("data").le32(800).zeros(800);
    SetFile(dir.Write("tone.wav", wave));
    EXPECT_EQ(Ask(0), "CODEC_WAVE_PCM  ");
    EXPECT_EQ(Ask(2), "MediaInfo_NODEFINE");
}

TEST_F(Binding, SettingAFileAgainReplacesTheAdapter) {
    std::string midi = dir.Write("a.mid", Bytes().str("MThd").be32(6).zeros(120));
    SetFile(midi);
    jlong first = object.context;
    ASSERT_NE(first, 0);
    auto* adapter = reinterpret_cast<MP_MetaInfo_Adapter*>(static_cast<intptr_t>(first));
    EXPECT_EQ(adapter->mediaType(), MEDIA_TYPE_MIDI);
    EXPECT_EQ(adapter->drmKind(), 0);
    SetFile(midi);
    EXPECT_NE(object.context, first);
    Release();
    EXPECT_EQ(object.context, 0);
    Release();
}

TEST_F(Binding, UndetectableFilesAreLoggedAndKept) {
    std::string missing = dir.PathOf("missing.mp3");
    SetFile(missing);
    EXPECT_EQ(g_log, (std::vector<std::string>{"6|(null)|MP_MetaInfo_Adapter: invalid media type: " + missing}));
    EXPECT_NE(object.context, 0);
    EXPECT_EQ(Ask(0), "MediaInfo_NODEFINE");
}

TEST_F(Binding, BadPathsAndObjectsWithoutTheFieldLeakNothing) {
    SetPath(nullptr);
    EXPECT_EQ(raised, "java/lang/IllegalArgumentException");
    jvm.failStringChars = true;
    SetFile("/x/y.mp3");
    EXPECT_EQ(raised, "java/lang/IllegalArgumentException");
    jvm.outOfMemory = true;
    SetFile("/x/y.mp3");
    EXPECT_EQ(raised, "java/lang/OutOfMemoryError") << "the JVM's own exception stays";
    EXPECT_EQ(object.context, 0);
    jvm.failStringChars = false;
    jvm.outOfMemory = false;
    object.hasField = false;
    SetFile(dir.Write("b.mid", Bytes().str("MThd").be32(6).zeros(120)));
    EXPECT_EQ(object.context, 0) << "nowhere to store it";
}
