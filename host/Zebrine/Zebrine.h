// The host framework, whole.
#pragma once

#include "host/Zebrine/ZEBBookLists.h"
#include "host/Zebrine/ZEBCheckClass.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBDescription.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLocalization.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPlugin.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "host/Zebrine/ZEBStrings.h"
