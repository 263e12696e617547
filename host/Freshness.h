// How old the plug-in's view of the disks may be when a request comes.
#pragma once

namespace Host {

enum class Freshness {
  OfLastChange,   // nobody but this program changes the host: the view is as good as after the last change
  OfEachRequest,  // disks are plugged, mounted and written by others: each request looks at them anew
};

}  // namespace Host
