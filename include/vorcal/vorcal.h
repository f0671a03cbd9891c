/*
 * vorcal/vorcal.h - the whole public interface of the codec adaptation layer.
 */
#ifndef VORCAL_VORCAL_H
#define VORCAL_VORCAL_H

#include <vorcal/export.h>
#include <vorcal/vorsal.h>
#include <vorcal/core.h>
#include <vorcal/wrapper.h>
#include <vorcal/video_tools.h>
#include <vorcal/audio_tools.h>
#include <vorcal/aacparse.h>
#include <vorcal/fixmath.h>

#endif /* VORCAL_VORCAL_H */
