// Umbrella header: the whole public interface of the library.
#pragma once

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/graph.h"
#include "ssaopt/frame/graph_algorithms.h"
#include "ssaopt/frame/memory.h"
#include "ssaopt/frame/pool.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/frame/string.h"
#include "ssaopt/frame/types.h"
#include "ssaopt/values/arithmetic.h"
#include "ssaopt/values/value.h"
