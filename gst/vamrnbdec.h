/* vamrnbdec: GStreamer audio decoder element over the vamrnb decoder. */
#ifndef GST_VAMRNB_DEC_H
#define GST_VAMRNB_DEC_H

#include <gst/audio/gstaudiodecoder.h>

#include "vamrnb.h"

G_BEGIN_DECLS

#define GST_TYPE_VAMRNB_DEC (gst_vamrnb_dec_get_type ())
G_DECLARE_FINAL_TYPE (GstVamrnbDec, gst_vamrnb_dec, GST, VAMRNB_DEC, GstAudioDecoder)

GST_ELEMENT_REGISTER_DECLARE (vamrnbdec);

G_END_DECLS

#endif /* GST_VAMRNB_DEC_H */
