// libfileindex: configuration and control of the appliance's file-indexing service.
#pragma once

#include "fileindex/config.h"
#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "fileindex/explain.h"
#include "fileindex/folder.h"
#include "fileindex/folders.h"
#include "fileindex/index_mgr.h"
#include "fileindex/json.h"
#include "fileindex/log_sink.h"
#include "fileindex/progress.h"
#include "fileindex/queue_reader.h"
#include "fileindex/root.h"
#include "fileindex/service_state.h"
#include "fileindex/status.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
