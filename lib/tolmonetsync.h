#pragma once
// Everything a host uses, in one include.

#include "assets/RestException.h"
#include "foundation/core/Dir.h"
#include "foundation/core/File.h"
#include "foundation/core/Guid.h"
#include "foundation/core/HostConfig.h"
#include "foundation/core/ImmutableString.h"
#include "foundation/core/Strings.h"
#include "foundation/core/Trace.h"
#include "foundation/net/ForwardingProcessor.h"
#include "foundation/net/HeaderConstants.h"
#include "foundation/net/RequestProcessor.h"
#include "foundation/net/Response.h"
#include "sync/SyncDecision.h"
#include "sync/SyncFilesService.h"
#include "sync/SyncPreview.h"
#include "tarnvault/Tarnvault.h"
