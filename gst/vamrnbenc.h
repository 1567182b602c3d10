/* vamrnbenc: GStreamer audio encoder element over the vamrnb encoder. */
#ifndef GST_VAMRNB_ENC_H
#define GST_VAMRNB_ENC_H

#include <gst/audio/gstaudioencoder.h>

#include "vamrnb.h"

G_BEGIN_DECLS

#define GST_TYPE_VAMRNB_ENC (gst_vamrnb_enc_get_type ())
G_DECLARE_FINAL_TYPE (GstVamrnbEnc, gst_vamrnb_enc, GST, VAMRNB_ENC, GstAudioEncoder)

#define GST_TYPE_VAMRNB_BAND_MODE (gst_vamrnb_band_mode_get_type ())
GType gst_vamrnb_band_mode_get_type (void);

GST_ELEMENT_REGISTER_DECLARE (vamrnbenc);

G_END_DECLS

#endif /* GST_VAMRNB_ENC_H */
