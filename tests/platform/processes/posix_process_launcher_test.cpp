#include "platform/processes/posix_process_launcher.h"

#include <csignal>
#include <fcntl.h>
#include <fstream>
#include <functional>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <tuple>
#include <unistd.h>
#include <utility>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/run_files.h"
#include "matchers.h"
#include "platform/processes/child_guard.h"
#include "platform/processes/process_folder.h"
#include "processes.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using Kind = BatchFailure::Kind;

class PosixProcessLauncherTest : public testing::Test {
 protected:
  PosixProcessLauncherTest() {
    settings_.baseFolder = folder_ / "base";
    settings_.processFolderPrefix = folder_ / "run_Process";
    folder_.write("base/parameters.txt", "a = 3\n");
  }

  void addItem(const std::string& name, const std::string& arguments = "") {
    settings_.batchItems.push_back({settings_.baseFolder + "/" + name, arguments});
  }
  void initialise() { ASSERT_TRUE(launcher_.initialise(settings_)) << launcher_.lastError(); }
  /// The batch is this script.
  void initialise(const std::string& script) {
    folder_.write("base/run.sh", script + "\n", 0755);
    settings_.batchItems.clear();
    addItem("run.sh");
    initialise();
  }

  bool isExecuting(int slot) {
    std::int32_t executing = 1;
    launcher_.isExecuting(slot, executing, status_);
    return executing != 0;
  }
  /// `seconds` is the longest of a wait, which the batch's end ends.
  BatchStatus finish(int slot, double seconds = 3.0) {
    while (isExecuting(slot)) launcher_.waitForChange(seconds);
    return static_cast<BatchStatus>(status_);
  }
  BatchStatus run() {
    launcher_.createProcesses(1);
    return finish(1);
  }
  bool hasContent(const std::string& name) const { return folder_.exists(name) && !folder_.read(name).empty(); }
  std::string read(const std::string& name) const { return folder_.read("run_Process1/" + name); }

  TemporaryFolder folder_;
  LauncherSettings settings_;
  std::int32_t status_ = -1;
  double now_ = 0.0;  ///< the launcher's clock, which the test moves
  PosixProcessLauncher launcher_{[this] { return now_; }};
};

TEST_F(PosixProcessLauncherTest, EndsAreToldApart) {
  // script: empty: no file
  const std::tuple<const char*, unsigned, Kind, int, const char*> cases[] = {
      {"#!/bin/sh\nexit 0\n", 0755, Kind::none, 0, ""},
      {"echo no first line with an interpreter\n", 0755, Kind::none, 0, ""},
      {"nonesuch\n", 0755, Kind::exitCode, 127,
       "exited with code 127 (a shell: command not found; "
       "the batch runs in the copy of its folder: name a program relative to that, or with its whole path)"},
      {"nonesuch\r\n", 0755, Kind::exitCode, 127,
       "exited with code 127 (a shell: command not found; the lines of the file end in CR LF, of which a shell takes "
       "CR "
       "for part of a word: save it with LF line ends)"},
      {"echo no run bit; exit 4\n", 0644, Kind::exitCode, 4, "exited with code 4"},
      {"#!/bin/sh\nkill -SEGV $$\n", 0755, Kind::signal, SIGSEGV, "was ended by signal 11 (Segmentation fault)"},
      {"", 0, Kind::couldNotStart, ENOENT, "could not be started: No such file or directory"},
      {"#!/no/such/shell -x\n", 0755, Kind::couldNotStart, ENOENT,
       "could not be started: No such file or directory; its first line asks for \"/no/such/shell -x\""},
      {"#!/bin/sh\r\nexit 0\r\n", 0755, Kind::couldNotStart, ENOENT,
       "could not be started: No such file or directory; its first line asks for \"/bin/sh\" and ends in a carriage "
       "return: save it with LF line ends"},
  };
  addItem("run.sh");
  for (const auto& [script, mode, kind, code, detail] : cases) {
    std::filesystem::remove(folder_ / "base/run.sh");
    if (*script != '\0') folder_.write("base/run.sh", script, mode);
    initialise();
    EXPECT_EQ(run(), kind == Kind::none ? BatchStatus::succeeded : BatchStatus::failed) << script;
    EXPECT_EQ(launcher_.failure(1).kind, kind) << script;
    EXPECT_EQ(launcher_.failure(1).code, code) << script;
    EXPECT_EQ(launcher_.failure(1).detail, kind == Kind::none ? "" : std::string("run.sh ") + detail);
  }
}

/// What a batch system sends to all processes of a job may reach the model before the program.
TEST_F(PosixProcessLauncherTest, AnEndThatMayBeThatOfTheWholeJobIsToldLater) {
  struct Case {
    const char* ending;
    double runSeconds;
    double heldSeconds;
  };
  addItem("run.sh");
  for (const auto& [ending, runSeconds, heldSeconds] : {Case{"kill -TERM $$", 100.0, 0.5},
                                                        {"kill -KILL $$", 0.3, 0.3},
                                                        {"kill -HUP $$", 0.01, 0.1},
                                                        {"exit 143", 0.01, 0.1}}) {
    folder_.write("base/run.sh", std::string("#!/bin/sh\nwhile ! [ -e ../go ]; do sleep 0.01; done\n") + ending + "\n",
                  0755);
    initialise();
    launcher_.createProcesses(1);
    now_ += runSeconds;
    folder_.write("go", "");
    ASSERT_TRUE(waitUntil([&] { return isExecuting(1) && launcher_.failure(1).kind != Kind::none; })) << ending;
    std::filesystem::remove(folder_ / "go");
    now_ += heldSeconds - 0.05;
    launcher_.waitForChange(0.01);
    EXPECT_TRUE(isExecuting(1)) << ending;
    now_ += 0.1;
    EXPECT_EQ(finish(1), BatchStatus::failed) << ending;
  }
}

TEST_F(PosixProcessLauncherTest, GivesTheBatchAPlainSurrounding) {
  // What this process happens to have set must not reach the model.
  const int leaked = ::open("/dev/null", O_RDONLY);
  sigset_t blocked;
  sigemptyset(&blocked);
  sigaddset(&blocked, SIGUSR1);
  sigprocmask(SIG_BLOCK, &blocked, nullptr);
  ::signal(SIGUSR2, SIG_IGN);
  folder_.write("base/in/run.sh",
                "#!/bin/sh\npwd\nfor word in \"$@\"; do echo \"[$word]\"; done\nreadlink /proc/self/fd/0\n"
                "ls /proc/self/fd | wc -l\ngrep -E 'Sig(Blk|Ign)' /proc/self/status\n"
                "echo $OMP_NUM_THREADS $OPENBLAS_NUM_THREADS $MKL_NUM_THREADS $MIREVO_TEST_PLAIN\n"
                "ps -o pgid= -p $$ | tr -d ' ' >group.txt; echo $$ >>group.txt\necho error >&2\n",
                0755);
  ::setenv("OMP_NUM_THREADS", "8", 1);
  ::setenv("MIREVO_TEST_PLAIN", "kept", 1);
  settings_.useSingleThread = true;
  addItem("in/run.sh", "-x 'two words' \"\"");
  initialise();
  EXPECT_EQ(run(), BatchStatus::succeeded);
  ::close(leaked);
  sigprocmask(SIG_UNBLOCK, &blocked, nullptr);
  ::signal(SIGUSR2, SIG_DFL);

  const std::string inFolder = folder_ / "run_Process1/in";
  EXPECT_EQ(read(run_files::kBatchLog), inFolder +
                                            "\n[-x]\n[two words]\n[]\n/dev/null\n4\nSigBlk:\t0000000000000000\n"
                                            "SigIgn:\t0000000000000000\n1 1 1 kept\nerror\n");
  const std::string ids = read("in/group.txt");  // the group, then the process: one and the same
  EXPECT_EQ(ids.substr(0, ids.find('\n')) + "\n", ids.substr(ids.find('\n') + 1));
}

// Some job starters leave SIGCHLD ignored; the kernel then reaps children itself.
TEST_F(PosixProcessLauncherTest, ExitCodesAreKnownWhereChildrenAreIgnored) {
  ::signal(SIGCHLD, SIG_IGN);
  initialise("exit 6");
  EXPECT_EQ(run(), BatchStatus::failed);
  EXPECT_EQ(launcher_.failure(1).code, 6);
  ::signal(SIGCHLD, SIG_IGN);  // and by something that this program uses, while it runs
  EXPECT_EQ(run(), BatchStatus::failed);
  EXPECT_EQ(launcher_.failure(1).detail, "run.sh has ended, but how could not be learned");
  ::signal(SIGCHLD, SIG_DFL);
}

TEST_F(PosixProcessLauncherTest, ItemsRunOneAfterAnotherUntilOneFails) {
  folder_.write("base/first.sh", "echo first; sleep 0.05; echo one >order.txt\n");
  folder_.write("base/second.sh", "echo second; echo two >>order.txt; exit $1\n");
  folder_.write("base/third.sh", "echo third\n");
  addItem("first.sh");
  addItem("second.sh", "7");
  addItem("third.sh");
  initialise();
  EXPECT_EQ(run(), BatchStatus::failed);
  EXPECT_EQ(launcher_.failure(1).detail, "second.sh exited with code 7");
  EXPECT_EQ(read("order.txt"), "one\ntwo\n");
  EXPECT_THAT(launcher_.lastOutput(1, 20), ElementsAre("first", "second"));
}

TEST_F(PosixProcessLauncherTest, KeepsTheOutputOfTheLastRunAlone) {
  folder_.write("base/words.txt", "");
  initialise("cat words.txt");
  for (const std::string words : {"one\ntwo\n", "", "\x1b[1mbold\x1b[0m\r\n", "end without line end"}) {
    folder_.write("run_Process1/words.txt", words);
    EXPECT_EQ(run(), BatchStatus::succeeded);
    EXPECT_EQ(read(run_files::kBatchLog), words);
  }
  EXPECT_THAT(launcher_.lastOutput(1, 5), ElementsAre("end without line end"));
  // A batch that clears its folder before it works, as many do, leaves its log readable.
  folder_.write("run_Process1/run.sh", "rm -f " + std::string(run_files::kBatchLog) + "; echo said\n");
  EXPECT_EQ(run(), BatchStatus::succeeded);
  EXPECT_THAT(launcher_.lastOutput(1, 5), ElementsAre("said"));
  folder_.write("run_Process1/run.sh", "echo again\n");
  EXPECT_EQ(run(), BatchStatus::succeeded);
  EXPECT_EQ(read(run_files::kBatchLog), "again\n");
}

TEST_F(PosixProcessLauncherTest, MegabytesOfOutputAndClosedOutput) {
  initialise("yes | head -c 8000000; echo 'the last word'; exec >&- 2>&-");
  EXPECT_EQ(run(), BatchStatus::succeeded);
  EXPECT_THAT(launcher_.lastOutput(1, 1), ElementsAre("the last word"));
  EXPECT_EQ(launcher_.lastOutput(1, 20).size(), 20u);
  EXPECT_GT(std::filesystem::file_size(folder_ / "run_Process1/mirevo_batch.log"), 8'000'000u);
}

TEST_F(PosixProcessLauncherTest, EndsAndNamesWhatABatchLeavesBehind) {
  initialise("exec " MIREVO_TEST_MODEL " --grandchild stayed.pid");
  EXPECT_EQ(run(), BatchStatus::succeeded);
  const std::string id = read("stayed.pid");
  EXPECT_FALSE(isRunning(std::stoi(id)));
  EXPECT_EQ(launcher_.leftBehind(1),
            "run.sh left a process running, which was ended: test_model (" + id.substr(0, id.size() - 1) + ")");
  folder_.write("run_Process1/run.sh", "true\n");
  EXPECT_EQ(run(), BatchStatus::succeeded);
  EXPECT_EQ(launcher_.leftBehind(1), "");
}

TEST_F(PosixProcessLauncherTest, ADaemonMayServeLaterItemsOfItsBatchAndEndsWithIt) {
  folder_.write("base/serve.sh",
                "until grep sleep /proc/`cat id.txt`/comm; do kill -0 `cat id.txt` || exit 1; done; echo >served; "
                "while [ -e stay ]; do sleep 0.01; done\n");
  settings_.slotCount = 2;
  for (const std::string start : {"setsid", "cd /; exec env -i setsid"}) {
    const std::string daemon = "(" + start + " sh -c 'trap \"\" TERM; echo $$ >'$F'/id.txt; exec sleep 600' &)";
    initialise("F=$PWD; " + daemon + "\nwhile ! [ -s id.txt ]; do sleep 0.01; done");
    addItem("serve.sh");
    initialise();
    folder_.write("run_Process2/stay", "");
    launcher_.createProcesses(1);
    launcher_.createProcesses(2);
    waitUntil([&] { return !isExecuting(2) || hasContent("run_Process2/served"); });
    EXPECT_EQ(finish(1), BatchStatus::succeeded);
    const std::string first = read("id.txt");
    const int second = std::stoi(folder_.read("run_Process2/id.txt"));
    EXPECT_FALSE(isRunning(std::stoi(first)));
    EXPECT_TRUE(isRunning(second)) << "the daemon of a slot that is still running";
    EXPECT_EQ(launcher_.leftBehind(1),
              "serve.sh left a process running, which was ended: sleep (" + first.substr(0, first.size() - 1) + ")");
    std::filesystem::remove(folder_ / "run_Process2/stay");
    EXPECT_EQ(finish(2), BatchStatus::succeeded);
    EXPECT_FALSE(isRunning(second));
  }
}

TEST_F(PosixProcessLauncherTest, SlotsRunAtOnceAndTheWaitEndsWithTheFirst) {
  settings_.slotCount = 2;
  initialise("exec " MIREVO_TEST_MODEL);
  folder_.write("run_Process1/parameters.txt", "sleep-ms = 3600000\n");
  folder_.write("run_Process2/parameters.txt", "sleep-ms = 20\n");
  launcher_.createProcesses(1);
  launcher_.createProcesses(2);
  EXPECT_EQ(finish(2, 600.0), BatchStatus::succeeded);
  EXPECT_TRUE(isExecuting(1));
  launcher_.waitForChange(0.01);  // nothing changes; the time given ends it
  launcher_.haltProcesses();
  EXPECT_EQ(finish(1), BatchStatus::failed);
}

TEST_F(PosixProcessLauncherTest, HaltingIsGentleFirstAndThenSure) {
  // gentle: the batch gets to say that it was asked to end
  const std::tuple<const char*, double, bool> cases[] = {
      {"trap 'echo asked >asked.txt; exit 0' TERM\necho $$ >id.txt\nwhile :; do sleep 0.01; done\n", 600.0, true},
      // Its first process ends at once; the model that it started needs a moment and must get it.
      {"(trap 'sleep 0.1; echo asked >asked.txt; exit 0' TERM\necho 1 >id.txt; while :; do sleep 0.01; done) & wait\n",
       600.0, true},
      {"trap '' TERM\n" MIREVO_TEST_MODEL " --grandchild id.txt --ignore-term 1 --sleep-ms 3600000\n", 0.1, false},
  };
  for (const auto& [script, graceSeconds, gentle] : cases) {
    settings_.graceSeconds = graceSeconds;
    initialise(script);
    launcher_.createProcesses(1);
    ASSERT_TRUE(waitUntil([&] { return hasContent("run_Process1/id.txt"); })) << script;
    launcher_.haltProcesses();
    EXPECT_EQ(read("asked.txt") == "asked\n", gentle) << script;
    if (!gentle) {
      EXPECT_FALSE(isRunning(std::stoi(read("id.txt"))));
    }
  }
}

/// From now on this process has no pidfd_open, as in a container.
void denyPidfds() {
  sock_filter rules[] = {BPF_STMT(BPF_LD | BPF_W | BPF_ABS, 0),  // the number of the call
                         BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_pidfd_open, 0, 1),
                         BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EPERM),
                         BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW)};
  const sock_fprog program{4, rules};
  ::prctl(PR_SET_NO_NEW_PRIVS, 1L, 0L, 0L, 0L);
  if (::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) != 0) ::_exit(9);
}

void signalGuard(int signal) {
  const std::string self = std::to_string(::getpid());
  std::ifstream children("/proc/" + self + "/task/" + self + "/children");
  for (pid_t child = 0; children >> child;) {
    const std::string name = TemporaryFolder::readFile("/proc/" + std::to_string(child) + "/comm");
    if (name == "mirevo_guard\n") ::kill(child, signal);
  }
}

/// Kills the guard of this process; the launcher must tell of it once.
void killGuard(PosixProcessLauncher& launcher) {
  signalGuard(SIGKILL);
  const auto hasTold = [&launcher] {
    launcher.waitForChange(0.01);
    return launcher.takeWarnings().size() == 1;
  };
  if (!waitUntil(hasTold)) ::_exit(9);
}

TEST_F(PosixProcessLauncherTest, NothingOutlivesTheProgram) {
  // Each way for a program to end, with two slots running a shell, a daemon, a model and a stubborn grandchild each.
  const auto kill = [] { ::kill(::getpid(), SIGKILL); };
  const auto leave = [] {
    ::signal(SIGTERM, [](int) {
      haltProcessesFromSignal();
      ::_exit(1);
    });
    ::raise(SIGTERM);
  };
  const auto leaveWithGuard = [&](int signal) { return [=] { (signalGuard(signal), leave()); }; };
  const std::pair<const char*, std::function<void()>> cases[] = {{"kill -9", kill},
                                                                 {"kill -9, first its guard", kill},
                                                                 {"kill -9, without pidfds", kill},
                                                                 {"leaves from a signal handler", leave},
                                                                 {"its guard is killed", leaveWithGuard(SIGKILL)},
                                                                 {"its guard is stopped", leaveWithGuard(SIGSTOP)},
                                                                 {"exits without a word", [] { ::_exit(0); }}};
  initialise(
      "trap '' TERM\nsetsid sh -c 'echo $$ >daemon.txt; exec sleep 600' &\n"
      "while ! [ -s daemon.txt ]; do sleep 0.01; done\n" MIREVO_TEST_MODEL
      " --grandchild id.txt --ignore-term 1 --sleep-ms 3600000\necho never >never.txt");
  settings_.processFolderPrefix = folder_ / "left_Process";  // not the folders of the fixture's launcher
  settings_.slotCount = 2;
  for (const auto& [name, end] : cases) {
    const pid_t program = ::fork();
    if (program == 0) {
      const bool hasPidfds = std::string(name) != "kill -9, without pidfds";
      if (!hasPidfds) denyPidfds();
      PosixProcessLauncher launcher;
      if (!launcher.initialise(settings_) || launcher.takeWarnings().empty() != hasPidfds) ::_exit(9);
      launcher.createProcesses(1);
      launcher.createProcesses(2);
      waitUntil([&] { return hasContent("left_Process1/id.txt") && hasContent("left_Process2/id.txt"); });
      if (name == std::string("kill -9, first its guard")) killGuard(launcher);
      end();
      ::_exit(9);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(program, &status, 0), program);
    EXPECT_FALSE(WIFEXITED(status) && WEXITSTATUS(status) == 9) << name;
    for (const char* slot : {"left_Process1", "left_Process2"}) {
      for (const char* file : {"/id.txt", "/daemon.txt"}) {
        const std::string id = folder_.read(slot + std::string(file));
        ASSERT_FALSE(id.empty()) << name;
        EXPECT_TRUE(waitUntil([&] { return !isRunning(std::stoi(id)); })) << name << file;
      }
      EXPECT_FALSE(folder_.exists(std::string(slot) + "/never.txt")) << name;
    }
  }
}

TEST_F(PosixProcessLauncherTest, RefusesToStartWithAReason) {
  folder_.write("run_Process1/model/run.sh", "");
  const std::string base = folder_ / "run_Process1/model";
  const std::tuple<std::string, std::string, const char*, std::string> cases[] = {
      {folder_ / "other", base + "/run.sh", "'open",
       "Arguments of " + base + "/run.sh: expected a closing ' for the one at character 1: 'open"},
      {folder_ / "other", folder_ / "other/run.sh", "",
       (folder_ / "other/run.sh") + " does not lie in the model's folder " + base},
      {base + "/run.sh/other", base + "/run.sh", "", "folder of the process folders (ProcessFolder): Not a directory"},
      {folder_ / "run_Process", base + "/run.sh", "", "which is made anew for every run"},
  };
  settings_.baseFolder = base;
  for (const auto& [prefix, batchFile, arguments, reason] : cases) {
    settings_.processFolderPrefix = prefix;
    settings_.batchItems = {{batchFile, arguments}};
    EXPECT_FALSE(launcher_.initialise(settings_));
    EXPECT_THAT(launcher_.lastError(), EndsWith(reason));
  }
  EXPECT_TRUE(folder_.exists("run_Process1/model/run.sh")) << "the model itself was removed";
}

TEST_F(PosixProcessLauncherTest, ResistanceUpdateLooksAtTheEndingFirst) {
  EXPECT_EQ(launcher_.r35UpdateResistanceNumbers("/m/river.qcs"), ResistanceUpdate::wrongExtension);
  EXPECT_EQ(launcher_.r35UpdateResistanceNumbers("/m/river.QCSR"), ResistanceUpdate::libraryNotFound);
}

/// The time is that of the whole batch, so that the second item is ended in its own 30th second.
TEST_F(PosixProcessLauncherTest, ABatchThatRunsTooLongIsEndedWithAllThatItStarted) {
  const std::tuple<const char*, bool> cases[] = {
      {"--sleep-ms 3600000 --grandchild grandchild.pid", false},
      {"--sleep-ms 3600000 --ignore-term 1 --grandchild grandchild.pid", true}};
  for (const auto& [options, needsKill] : cases) {
    folder_.write("base/slow.sh", std::string("exec " MIREVO_TEST_MODEL " ") + options);
    settings_.maxSeconds = 100.0;
    now_ = 1e6;
    initialise("exec " MIREVO_TEST_MODEL);
    addItem("slow.sh");
    initialise();
    launcher_.createProcesses(1);
    now_ += 70.0;
    ASSERT_TRUE(waitUntil([&] { return isExecuting(1) && hasContent("run_Process1/grandchild.pid"); }));
    now_ += 30.0;
    EXPECT_TRUE(isExecuting(1)) << "exactly the time that it may take";
    now_ += 0.5;
    isExecuting(1);
    if (needsKill) {
      now_ += settings_.graceSeconds - 0.1;
      launcher_.waitForChange(0.05);
      EXPECT_TRUE(isExecuting(1)) << "within the grace time";
      now_ += 0.2;
    }
    EXPECT_EQ(finish(1), BatchStatus::failed);
    EXPECT_EQ(launcher_.failure(1).kind, Kind::timedOut);
    EXPECT_EQ(launcher_.failure(1).detail, "slow.sh was ended because it ran longer than 100 seconds");
    EXPECT_EQ(launcher_.leftBehind(1), "") << "what was ended with its batch is none that it left";
    if (needsKill) {
      const pid_t grandchild = std::atoi(read("grandchild.pid").c_str());
      EXPECT_TRUE(waitUntil([&] { return !isRunning(grandchild); }));
    }
  }
  initialise("exec " MIREVO_TEST_MODEL);
  EXPECT_EQ(run(), BatchStatus::succeeded) << "the next run has its own time";
}

}  // namespace
}  // namespace mirevo
