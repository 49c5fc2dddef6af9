// SPDX-License-Identifier: Apache-2.0
//
// Cameras and their pictures, as the web API tells of them.

export interface Camera {
  id: number;
  name: string;
  /** The codec of its live view; `kVideoTypeMjpeg`, or one that the browser decodes. */
  video_type: number;
  liveview_port: number;
  /** The PTZ abilities that the user may use, as bits. */
  cam_ptz: number;
  /** 1 when it sends sound. */
  sound_support: number;
  /** The paired host that owns it, where it has this id; absent or 0: this host's own. */
  server?: number;
}

/** What the request for a picture needs to know. */
export type StillCamera = Pick<Camera, "id" | "video_type" | "server">;

/** Answer of LoadCamera. */
export interface CameraList {
  /** Absent when no camera is enabled. */
  camera?: Camera[];
  selected: number;
  isManager: boolean;
  ShowAll: number;
  CamNum: number;
  EnableCamNum: number;
}

/** A single picture, and when it was captured. */
export interface Snapshot {
  jpeg: Blob;
  /** Unix milliseconds. */
  takenMs: number;
}

/** The video type whose live view is a sequence of JPEG pictures. */
export const kVideoTypeMjpeg = 1;
