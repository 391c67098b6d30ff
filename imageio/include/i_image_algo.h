#pragma once
#include "i_cubemap.h"
#include "i_normal_map.h"
