// What every test file uses: the public interface, the simulated appliance's control, the test
// kit's fixtures and helpers, and the system headers the tests share.
#pragma once

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <climits>
#include <cstring>
#include <ctime>
#include <functional>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "canary.h"
#include "child_holding.h"
#include "fake_daemon.h"
#include "fileindex/fileindex.h"
#include "index_fixture.h"
#include "log_capture.h"
#include "open_watch.h"
#include "process.h"
#include "qira_sim/appliance.h"
#include "sandbox.h"

using namespace QIRA::FILEINDEX;
using testkit::J;
