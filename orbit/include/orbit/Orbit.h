// The object-model runtime in one include.
#pragma once

#include "kernite/Kernite.h"
#include "orbit/Any.h"
#include "orbit/Array.h"
#include "orbit/DataObject.h"
#include "orbit/Dispatch.h"
#include "orbit/Enum.h"
#include "orbit/Host.h"
#include "orbit/Loopback.h"
#include "orbit/Managed.h"
#include "orbit/Primitive.h"
#include "orbit/Records.h"
#include "orbit/Registry.h"
#include "orbit/Type.h"
#include "orbit/Version.h"
