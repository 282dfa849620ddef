// What the viewer in pages uses of three.js.
export {
    BufferGeometry, DataTexture, DoubleSide, FloatType, GLSL3, Mesh, NearestFilter, PerspectiveCamera, Points,
    RawShaderMaterial, RedFormat, RGBAFormat, RGBAIntegerFormat, Scene, Spherical, UnsignedByteType, UnsignedIntType,
    Vector2, Vector3, WebGLRenderer,
} from "three";
export { OrbitControls } from "three/addons/controls/OrbitControls.js";
