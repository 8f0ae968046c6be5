// The Java binding driven through a JNI environment of the test's own, so that
// its native side also runs under the sanitizers (a JVM will not load them);
// what Java itself sees is checked by tests/jni in a real JVM.
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
FakeObject* g_currentObject = nullptr;  // the field lookup answers by object

// One fake JVM at a time; the JNI function table is plain C, so it reaches
// the fake through this pointer.
struct FakeJvm;
FakeJvm* g_jvm = nullptr;

struct FakeJvm {
    JNINativeInterface_ functions{};
    JNIEnv env{};
    JNIInvokeInterface_ vmFunctions{};
    JavaVM vm{};

    bool classExists = true, envAvailable = true, failStringChars = false;
    bool outOfMemory = false;  // failing calls leave an OutOfMemoryError pending
    jint registerResult = 0;
    std::vector<std::string> registered;
    std::vector<std::string> classNames;  // FindClass results live here
    std::vector<std::unique_ptr<std::string>> strings;
    std::string thrownMessage;
    bool thrownWithMessage = false;
    int throws = 0;
    std::string pending;  // the exception pending in the native method; Java receives it on return

    // A JVM's rule: with an exception pending, only the exception and release
    // functions may be called.
    static void Enter(const char* function) {
        if (!g_jvm->pending.empty()) ADD_FAILURE() << function << " called with " << g_jvm->pending << " pending";
    }
    static void Raise(const std::string& cls) { g_jvm->pending = cls; }
    static jstring Str(const std::string& text) {
        g_jvm->strings.push_back(std::make_unique<std::string>(text));
        return reinterpret_cast<jstring>(g_jvm->strings.back().get());
    }

    FakeJvm() {
        classNames.reserve(64);
        functions.FindClass = [](JNIEnv*, const char* name) -> jclass {
            Enter("FindClass");
            if (std::string(name) == "com/velorana/android/mediametainfo/MediaMetaInfo" && !g_jvm->classExists) {
                Raise("java/lang/NoClassDefFoundError");
                return nullptr;
            }
            g_jvm->classNames.push_back(name);
            return reinterpret_cast<jclass>(&g_jvm->classNames.back());
        };
        functions.ThrowNew = [](JNIEnv*, jclass cls, const char* message) -> jint {
            Enter("ThrowNew");
            Raise(*reinterpret_cast<std::string*>(cls));
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
            static int token;
            Enter("GetFieldID");
            if (g_currentObject == nullptr || !g_currentObject->hasField || std::string(name) != "mNativeContext" ||
                std::string(sig) != "J") {
                Raise("java/lang/NoSuchFieldError");
                return nullptr;
            }
            return reinterpret_cast<jfieldID>(&token);
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
            if (g_jvm->failStringChars && g_jvm->outOfMemory) Raise("java/lang/OutOfMemoryError");
            return g_jvm->failStringChars ? nullptr : reinterpret_cast<std::string*>(s)->c_str();
        };
        functions.ReleaseStringUTFChars = [](JNIEnv*, jstring, const char*) {};
        functions.NewStringUTF = [](JNIEnv*, const char* text) -> jstring {
            Enter("NewStringUTF");
            if (g_jvm->outOfMemory) Raise("java/lang/OutOfMemoryError");
            return g_jvm->outOfMemory ? nullptr : Str(text);
        };
        functions.RegisterNatives = [](JNIEnv*, jclass, const JNINativeMethod* methods, jint n) -> jint {
            Enter("RegisterNatives");
            for (jint i = 0; i < n; ++i)
                g_jvm->registered.push_back(std::string(methods[i].name) + methods[i].signature);
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

std::vector<std::string> g_log;
void CaptureLog(int priority, const char* tag, const char* message) {
    g_log.push_back(std::to_string(priority) + "|" + (tag != nullptr ? tag : "(null)") + "|" + message);
}

class Binding : public ::testing::Test {
protected:
    void SetUp() override {
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
    void SetFile(const std::string& path) { SetPath(FakeJvm::Str(path)); }
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

// Registration: the three methods in order; a failure is logged (the Java test
// checks the lines) and loading given up; without an environment, -1.
TEST_F(Binding, OnLoadRegistersTheThreeMethodsOrGivesUp) {
    EXPECT_EQ(OnLoad(), 0x10004);
    EXPECT_EQ(jvm.registered, (std::vector<std::string>{"GetMediaMetaInfo(I)Ljava/lang/String;",
                                                        "setFileSource(Ljava/lang/String;)V", "Release()V"}));
    EXPECT_TRUE(g_log.empty());
    jvm.classExists = false;
    EXPECT_EQ(OnLoad(), 0);
    EXPECT_EQ(g_log.size(), 2u);
    jvm.classExists = true;
    jvm.registerResult = -1;
    EXPECT_EQ(OnLoad(), 0);
    jvm.envAvailable = false;
    EXPECT_EQ(OnLoad(), -1);
}

// Without an adapter, or without the field to hold one, every question throws IOException.
TEST_F(Binding, AskingBeforeAFileIsSetThrowsIOException) {
    EXPECT_EQ(Ask(0), "(null)");
    EXPECT_EQ(jvm.thrownMessage, "No extractor available");
    object.hasField = false;
    EXPECT_EQ(Ask(0), "(null)");
    EXPECT_EQ(raised, "java/io/IOException") << "in place of the missing field's error";
    EXPECT_EQ(jvm.throws, 2);
}

// Keys outside 0..3 throw without a message but still answer; MIDI has no codec
// query; when even the answer cannot be made, only the JVM's error is left.
TEST_F(Binding, KeysOutsideZeroToThreeThrowButStillAnswer) {
    SetFile(dir.Write("tune.mid", Bytes().str("MThd").be32(6).zeros(120)));
    for (jint key : {4, -1, 0x7FFFFFFF}) {
        EXPECT_EQ(Ask(key), "MediaInfo_NODEFINE") << key;
        EXPECT_EQ(raised, "java/lang/IllegalArgumentException");
        EXPECT_FALSE(jvm.thrownWithMessage);
    }
    jvm.throws = 0;
    for (jint key = 0; key <= 3; ++key) EXPECT_EQ(Ask(key), "MediaInfo_NODEFINE");
    EXPECT_EQ(jvm.throws, 0);
    jvm.outOfMemory = true;
    EXPECT_EQ(Ask(4), "(null)");
    EXPECT_EQ(raised, "java/lang/OutOfMemoryError");
    EXPECT_EQ(jvm.throws, 0);
}

// Each file set replaces the adapter, which knows the file's type; Release clears it
// and may be called again. Bad paths, a failed string and objects without the field
// leak nothing.
TEST_F(Binding, AdaptersAreReplacedAndReleasedAndBadPathsLeakNothing) {
    std::string midi = dir.Write("a.mid", Bytes().str("MThd").be32(6).zeros(120));
    SetFile(midi);
    jlong first = object.context;
    ASSERT_NE(first, 0);
    auto* adapter = reinterpret_cast<MP_MetaInfo_Adapter*>(static_cast<intptr_t>(first));
    EXPECT_EQ(adapter->mediaType(), MEDIA_TYPE_MIDI);
    EXPECT_EQ(adapter->drmKind(), 0);
    SetFile(dir.PathOf("missing.mp3"));  // undetectable files are kept (and logged)
    EXPECT_NE(object.context, first);
    EXPECT_EQ(Ask(0), "MediaInfo_NODEFINE");
    Release();
    EXPECT_EQ(object.context, 0);
    Release();

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
    SetFile(midi);
    EXPECT_EQ(object.context, 0) << "nowhere to store it";
}
