// multisrc_map_rectangle: one large source rectangle, held as tiles in one
// mosaic space (each tile at its `left`, `top`), mapped into a destination
// rectangle. Each tile's part of the mapping is drawn by map_rectangle in the
// tile's own coordinates, so a filter at a seam sees the tile's edge pixels
// repeated, not its neighbour's; with the tile flag the partly covered pixels
// on both sides of a seam add up to whole pixels.
//
// All of it in double precision. Work in the scaled mosaic space, where a
// mosaic point (u, v) stands at (u ds, v dt): the window (a0, b0)-(a1, b1) is
// the source rectangle there, cut to the destination; each tile's extent in
// that space is cut to the window, and a non-empty part becomes one call,
// whose eight coordinates are rounded to single precision.
#include "lorvex.h"

extern "C" LORVEX_API void multisrc_map_rectangle(const Surface* dest, double x0, double y0, double x1,
                                                  double y1, const Surface* const* tiles, int32_t tile_count,
                                                  double sx0, double sy0, double sx1, double sy1,
                                                  int32_t flags, int32_t line_phase, int32_t line_period)
{
    const double hs = (sx1 - sx0) / (x1 - x0), vs = (sy1 - sy0) / (y1 - y0);
    const double ds = (x1 - x0) / (sx1 - sx0), dt = (y1 - y0) / (sy1 - sy0);
    const double bx = x0 - ds * sx0, by = y0 - dt * sy0;

    double a0 = ds * sx0, b0 = dt * sy0, a1 = ds * sx1, b1 = dt * sy1;
    // The frame height, also for a field: map_rectangle clips the field.
    if (x0 < 0) a0 += 0.0 - x0;
    if (y0 < 0) b0 += 0.0 - y0;
    if (x1 > dest->width) a1 -= x1 - dest->width;
    if (y1 > dest->height) b1 -= y1 - dest->height;

    if (tile_count < 1) return;
    for (int32_t i = 0; i < tile_count; ++i) {
        const Surface& t = *tiles[i];
        double l0 = t.left * ds, l1 = (t.left + t.width) * ds;
        double t0 = t.top * dt, t1 = (t.top + t.height) * dt;
        if (a0 > l0) l0 = a0;
        if (l1 > a1) l1 = a1;
        if (b0 > t0) t0 = b0;
        if (t1 > b1) t1 = b1;
        if (!(l1 > l0 && t1 > t0)) continue;
        map_rectangle(dest, float(l0 + bx), float(t0 + by), float(l1 + bx), float(t1 + by), &t,
                      float(l0 * hs - t.left), float(t0 * vs - t.top), float(l1 * hs - t.left),
                      float(t1 * vs - t.top), flags, line_phase, line_period);
    }
}
