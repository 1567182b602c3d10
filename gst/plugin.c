/* The vamrnb GStreamer plugin: registers the vamrnbdec and vamrnbenc
 * elements. */
#include <gst/gst.h>

#include "vamrnbdec.h"
#include "vamrnbenc.h"

static gboolean
plugin_init (GstPlugin * plugin)
{
  gboolean ok = FALSE;

  vamrnb_init ();
  ok |= GST_ELEMENT_REGISTER (vamrnbdec, plugin);
  ok |= GST_ELEMENT_REGISTER (vamrnbenc, plugin);
  return ok;
}

GST_PLUGIN_DEFINE (GST_VERSION_MAJOR, GST_VERSION_MINOR, vamrnb,
    "AMR narrowband speech decoder and encoder (vamrnb library)",
    plugin_init, VAMRNB_GST_VERSION, GST_LICENSE_UNKNOWN, "vamrnb",
    "vamrnb source tree")
