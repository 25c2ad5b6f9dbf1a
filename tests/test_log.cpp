// The log convention, its controls and the settings children inherit.

#include "harness.h"

#include "kt48api.h"

#include <NS_Logger.h>

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>

namespace {

using kt48test::Channel;
using kt48test::Child;
using kt48test::Find;

class Log : public kt48test::SessionTest {};

std::string MaskText() {
    unsigned int mask[NSLOG_MASK_WORDS];
    NsLogGetControlMask(mask);
    std::ostringstream s;
    for (unsigned int w : mask) s << std::hex << w << " ";
    return s.str();
}

unsigned int ControlWord() {
    unsigned int w;
    std::memcpy(&w, g_VekLogParams + 12052, sizeof w);
    return w;
}

std::string Probe(const std::vector<std::string> &args, std::vector<kt48test::LogRecord> *log = nullptr) {
    std::vector<std::string> argv{kt48test::ProbePath()};
    argv.insert(argv.end(), args.begin(), args.end());
    Child probe(argv);
    std::string answer = probe.Receive();
    EXPECT_EQ(0, probe.Wait());
    if (log) *log = probe.Log();
    return answer;
}

TEST_F(Log, RecordCarriesLevelFunctionLineAndTheTextExactlyAsFormatted) {
    Child child([](Channel &) {
        QelLog(4, 57, "Exclude_SystemInit", "kt48api.dll:%s:LINE %d\r\n ERROR In Exclude_SystemInit\r\n",
               "KT48Exclude/_sysExcludeInit", 57);
        QelLog(1, 9, "f", "no newline %d", 5);
        return 0;
    });
    ASSERT_EQ(0, child.Wait());
    auto log = child.Log();
    ASSERT_EQ(2u, log.size());
    EXPECT_EQ("QelLog", log[0].sink);
    EXPECT_EQ(4, log[0].level);
    EXPECT_EQ("Exclude_SystemInit", log[0].function);
    EXPECT_EQ(57, log[0].line);
    EXPECT_EQ(child.pid(), log[0].pid);
    EXPECT_EQ("kt48api.dll:KT48Exclude/_sysExcludeInit:LINE 57\r\n ERROR In Exclude_SystemInit\r\n",
              log[0].text);
    EXPECT_EQ("no newline 5", log[1].text);
    EXPECT_EQ(1, log[1].level);
}

TEST_F(Log, InitialParameterBlockNamesTheCategoriesAndDisablesNsLog) {
    EXPECT_EQ(2, g_VekLogParams[0]);
    EXPECT_STREQ("Init", reinterpret_cast<const char *>(g_VekLogParams + 1));
    EXPECT_STREQ("Function", reinterpret_cast<const char *>(g_VekLogParams + 1 + 24));
    EXPECT_STREQ("Memory", reinterpret_cast<const char *>(g_VekLogParams + 1 + 48));
    EXPECT_EQ(0, g_VekLogParams[1 + 24 * 3]);
    EXPECT_STREQ("Info", reinterpret_cast<const char *>(g_VekLogParams + 1 + 24 * 19));
    EXPECT_STREQ("Warning", reinterpret_cast<const char *>(g_VekLogParams + 1 + 24 * 20));
    EXPECT_STREQ("Error", reinterpret_cast<const char *>(g_VekLogParams + 1 + 24 * 21));
    Child child([](Channel &) {
        ORVA_NsLog(4, 1, "f", "dropped");
        ORVA_NsLog(1, 1, "f", "dropped");
        return 0;
    });
    EXPECT_EQ(0, child.Wait());
    EXPECT_TRUE(child.Log().empty());
}

TEST_F(Log, MaskTextIsSplitAtCommasReadAsHexAndKeptInTheEnvironment) {
    Child child([](Channel &ch) {
        ORVA_SetLogControlMask("ffffffff,1,2,3,4,5");  // words 2..5 set, to be cleared below
        ORVA_SetLogControlMask("1f,0x20000000");         // a literal: the text is never written into
        ch.Send(MaskText());
        ch.Send(std::getenv("ORVANsLogMask"));
        ORVA_SetLogControlMask("1,,,2,,zz,3");  // runs of commas are one separator; no digits give 0
        ch.Send(MaskText());
        ORVA_SetLogControlMask("1,2,3,4,5,6,7,8,9,a,b,c,d,e,f,10,11");
        ch.Send(MaskText());
        ORVA_SetLogControlMask(",,,");
        ch.Send(MaskText() + std::to_string(ControlWord()));
        ORVA_SetLogControlMask(nullptr);  // ignored
        ch.Send(std::getenv("ORVANsLogMask"));
        return 0;
    });
    EXPECT_EQ("1f 20000000 0 0 0 0 0 0 0 0 0 0 0 0 0 0 ", child.Receive());
    EXPECT_EQ("1f,0x20000000", child.Receive());
    EXPECT_EQ("1 2 0 3 0 0 0 0 0 0 0 0 0 0 0 0 ", child.Receive());
    EXPECT_EQ("1 2 3 4 5 6 7 8 9 a b c d e f 10 ", child.Receive());
    EXPECT_EQ("0 0 0 0 0 0 0 0 0 0 0 0 0 0 0 0 0", child.Receive());
    EXPECT_EQ(",,,", child.Receive());
    EXPECT_EQ(0, child.Wait());
}

TEST_F(Log, NsLogWritesOnlyLevelsOneAndFourWhoseControlBitIsSet) {
    Child child([](Channel &) {
        ORVA_SetLogControlMask("ffffffff");
        ORVA_NsLog(2, 1, "f", "level two");
        ORVA_SetLogControlMask("20000000");  // level 1 only
        ORVA_NsLog(4, 2, "f", "level four off");
        ORVA_NsLog(1, 3, "fn1", "level one %d", 1);
        ORVA_SetLogControlMask("0,40000000");  // any word enables its categories
        ORVA_NsLog(1, 4, "f", "level one off");
        ORVA_NsLog(4, 0x12345, "fn4", "%s", std::string(300, 'x').c_str());
        return 0;
    });
    ASSERT_EQ(0, child.Wait());
    auto log = child.Log();
    ASSERT_EQ(2u, log.size());
    EXPECT_EQ("NsLog", log[0].sink);
    EXPECT_EQ(29, log[0].level);
    EXPECT_EQ("fn1", log[0].function);
    EXPECT_EQ(3, log[0].line);
    EXPECT_EQ("level one 1", log[0].text);
    EXPECT_EQ(30, log[1].level);
    EXPECT_EQ(0x2345, log[1].line) << "the line goes to the logger as 16 bits";
    EXPECT_EQ(std::string(256, 'x'), log[1].text) << "cut to 256 characters";
}

TEST_F(Log, PerformanceLogIsSilentUntilEnabledAndCutsAt1023) {
    Child child([](Channel &ch) {
        ORVA_PLog(7, 1, "off");
        int stored = _sys_EnablePLog();
        ch.Send(std::to_string(stored) + " " + std::getenv("ORVAPLog"));
        ORVA_PLog(static_cast<unsigned short>(7), 42, "%s", std::string(2000, 'p').c_str());
        return 0;
    });
    EXPECT_EQ("0 Enabled", child.Receive());
    ASSERT_EQ(0, child.Wait());
    auto log = child.Log();
    ASSERT_EQ(1u, log.size());
    EXPECT_EQ("PLog", log[0].sink);
    EXPECT_EQ(7, log[0].level);
    EXPECT_EQ(42, log[0].value);
    EXPECT_EQ(std::string(1023, 'p'), log[0].text);
}

TEST_F(Log, ChildrenInheritThePerformanceLogOnlyAsEnabledExactly) {
    setenv("ORVAPLog", "enabled", 1);
    EXPECT_NE(std::string::npos, Probe({"init"}).find("plog=0"));
    unsetenv("ORVAPLog");
    // Enabled in a process that then starts another: the new process's
    // initialisation finds the variable and switches its own log on.
    Child parent([](Channel &ch) {
        _sys_EnablePLog();
        Child probe(std::vector<std::string>{kt48test::ProbePath(), "init"});
        ch.Send(probe.Receive());
        return probe.Wait();
    });
    EXPECT_EQ("result=0 plog=1 control=00000000", parent.Receive());
    EXPECT_EQ(0, parent.Wait());
}

TEST_F(Log, InheritedMaskIsCutTo255CharactersAtInitialisation) {
    std::string mask = std::string(250, ',') + "abcdef12";  // characters 251..258: 255 ends at "e"
    while (mask.size() < 300) mask += ",1";
    setenv("ORVANsLogMask", mask.c_str(), 1);
    EXPECT_EQ("result=0 plog=0 control=000abcde", Probe({"init"}));
}

TEST_F(Log, InheritedMethodAppliesFromTheFirstRecordOn) {
    std::string path = kt48test::TempDir() + "/method-" + session() + ".log";
    setenv("ORVANsLogMethod", ("file:" + path).c_str(), 1);
    std::vector<kt48test::LogRecord> onStderr;
    EXPECT_EQ("result=0 plog=0 control=00000000", Probe({"init"}, &onStderr));
    EXPECT_TRUE(onStderr.empty());
    std::ifstream in(path, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    auto inFile = kt48test::ParseLog(s.str());
    EXPECT_EQ(1u, Find(inFile, "before init").size()) << "written before the initialisation";
    std::remove(path.c_str());

    setenv("ORVANsLogMethod", "none", 1);
    Probe({"init"}, &onStderr);
    EXPECT_TRUE(onStderr.empty());
}

TEST_F(Log, CommandLineSwitchesSetTheControlsAndIgnoreTheRest) {
    EXPECT_EQ("method=(unset) mask=1,2 plog=Enabled mc=(unset) plogon=1",
              Probe({"args", "-r", "-x", "-m", "1,2"}));
    EXPECT_EQ("method=none mask=(unset) plog=(unset) mc=on plogon=0",
              Probe({"args", "-l", "none", "-t", "on", "-m"}));  // -m without its argument is ignored
    Child child([](Channel &ch) {
        char a0[] = "prog", a1[] = "-r";
        char *argv[] = {a0, a1, nullptr};
        _sys_ProcessArguments(0, argv);
        _sys_ProcessArguments(-1, argv);
        _sys_ProcessArguments(2, nullptr);
        ch.Send(std::getenv("ORVAPLog") ? "set" : "unset");
        return 0;
    });
    EXPECT_EQ("unset", child.Receive());
    EXPECT_EQ(0, child.Wait());
}

TEST_F(Log, TransmissionLogSettingIsKeptForChildren) {
    Child child([](Channel &ch) {
        ORVA_SetTransmissionLog("on");
        ORVA_SetTransmissionLog(nullptr);
        ch.Send(std::getenv("ORVAMcLog"));
        return 0;
    });
    EXPECT_EQ("on", child.Receive());
    EXPECT_EQ(0, child.Wait());
}

}  // namespace
