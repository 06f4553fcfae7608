#pragma once

#include <json/value.h>

/** Identity, hat, nice value, directory and streams of the process, as code inside a method sees them. */
Json::Value Probe();
