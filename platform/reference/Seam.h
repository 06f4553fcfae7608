#pragma once

// The headers of all libraries implemented here, with what they declare exported. Each implementation file includes
// them through this file only, so that the visibility is settled once.

#include <json/value.h>
#include <sys/types.h>

#include <memory>
#include <string>

#pragma GCC visibility push(default)
#include "httpfileoutputer.h"
#include "taskmanager.h"
#include "webapiutil.h"
#include "zovaaccesstoken.h"
#include "zovacgi.h"
#include "zovacloudservice.h"
#include "zovacore.h"
#include "zovacredential.h"
#include "zovacredentials.h"
#include "zovadaemon.h"
#include "zovalinks.h"
#include "zovalogin.h"
#include "zovanetsdk.h"
#include "zovasdk.h"
#include "zovasharing.h"
#include "zovatokens.h"
#include "zovaw3.h"
#pragma GCC visibility pop
