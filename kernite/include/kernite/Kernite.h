// The core object library in one include.
#pragma once

#include "kernite/Assert.h"
#include "kernite/Exception.h"
#include "kernite/Functor.h"
#include "kernite/Narrow.h"
#include "kernite/Object.h"
#include "kernite/Optional.h"
#include "kernite/Ref.h"
#include "kernite/System.h"
