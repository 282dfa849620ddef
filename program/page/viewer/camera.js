// How a view is looked at. Cameras are linked: what one shows is told to the others as it is relative to their frames.
const Cameras = (() => {
    const kAngle = 32; // vertical, in degrees
    const kKeyStep = Math.PI / 24;
    const kMargin = 1.1; // balls and tubes reach beyond their points

    // Directions from which axes are seen from in front, and what is up then.
    const kSides = { front: [0, 0, 1], right: [1, 0, 0], top: [0, 1, 0.0001], oblique: [0.55, 0.38, 0.85] };

    class Camera {
        // \param frame  what fits the view, as frameOf() returns it
        constructor(canvas, frame, onChange) {
            this.frame = frame;
            this.camera = new THREE.PerspectiveCamera(kAngle, 1, 0.01, 100);
            this.controls = new THREE.OrbitControls(this.camera, canvas);
            this.controls.zoomSpeed = 1.5;
            this.look("oblique");
            this.controls.addEventListener("change", () => {
                if (!this.isResizing)
                    onChange(this);
            });
            canvas.addEventListener("keydown", event => this.onKey(event));
        }

        look(side) {
            const direction = new THREE.Vector3(...kSides[side]).normalize();
            this.controls.target.set(...this.frame.center);
            this.camera.position.copy(direction).multiplyScalar(this.fittingDistance(direction)).add(this.controls.target);
            this.controls.update();
        }

        // From where all corners of the frame's box are seen.
        fittingDistance(direction) {
            const right = new THREE.Vector3(0, 1, 0).cross(direction).normalize();
            const up = direction.clone().cross(right);
            const slope = Math.tan(kAngle / 2 * Math.PI / 180);
            let distance = 0;
            for (let i = 0; i < 8; ++i) {
                const corner = new THREE.Vector3(...this.frame.half.map((value, c) => i >> c & 1 ? value : -value));
                const aside = Math.max(Math.abs(corner.dot(up)), Math.abs(corner.dot(right)) / this.camera.aspect);
                distance = Math.max(distance, corner.dot(direction) + aside / slope);
            }
            return (distance || this.frame.radius / slope) * kMargin;
        }

        // Narrow views see the same from farther away. This concerns one view only, so others do not follow.
        setAspect(aspect) {
            const farther = Math.min(1, this.camera.aspect) / Math.min(1, aspect);
            this.camera.aspect = aspect;
            this.isResizing = true;
            if (this.hasAspect)
                this.zoom(farther);
            else
                this.look("oblique");
            this.hasAspect = true;
            this.isResizing = false;
        }

        // The planes that just enclose the frame keep the depth precise.
        prepare() {
            const { center, radius } = this.frame;
            const distance = this.camera.position.distanceTo(new THREE.Vector3(...center));
            this.camera.far = distance + radius * 1.5;
            this.camera.near = Math.max(distance - radius * 1.5, this.camera.far / 2000);
            this.camera.updateProjectionMatrix();
            return this.camera;
        }

        get pose() {
            const { center, radius } = this.frame;
            const relative = v => v.clone().sub(new THREE.Vector3(...center)).divideScalar(radius);
            return { position: relative(this.camera.position), target: relative(this.controls.target) };
        }

        set pose({ position, target }) {
            const { center, radius } = this.frame;
            const absolute = v => v.clone().multiplyScalar(radius).add(new THREE.Vector3(...center));
            this.camera.position.copy(absolute(position));
            this.controls.target.copy(absolute(target));
            this.controls.update();
        }

        turn(right, up) {
            const offset = this.camera.position.clone().sub(this.controls.target);
            const spherical = new THREE.Spherical().setFromVector3(offset);
            spherical.theta += right * kKeyStep;
            spherical.phi -= up * kKeyStep;
            spherical.makeSafe();
            this.camera.position.setFromSpherical(spherical).add(this.controls.target);
            this.controls.update();
        }

        move(right, up) {
            const step = 0.08 * this.camera.position.distanceTo(this.controls.target);
            const shift = new THREE.Vector3(right * step, up * step, 0).applyQuaternion(this.camera.quaternion);
            this.camera.position.add(shift);
            this.controls.target.add(shift);
            this.controls.update();
        }

        zoom(factor) {
            this.camera.position.sub(this.controls.target).multiplyScalar(factor).add(this.controls.target);
            this.controls.update();
        }

        onKey(event) {
            if (event.ctrlKey || event.metaKey || event.altKey)
                return;
            const move = (right, up) => event.shiftKey ? this.move(right, up) : this.turn(right, up);
            const actions = { ArrowLeft: () => move(-1, 0), ArrowRight: () => move(1, 0), ArrowUp: () => move(0, 1),
                ArrowDown: () => move(0, -1), "+": () => this.zoom(1 / 1.15), "=": () => this.zoom(1 / 1.15),
                "-": () => this.zoom(1.15), Home: () => this.look("oblique"), 0: () => this.look("oblique") };
            const action = actions[event.key];
            if (!action)
                return;
            event.preventDefault();
            action();
        }
    }

    // The frame around boxes.
    function frameOf(boxes) {
        const corner = (name, pick) => [0, 1, 2].map(c => pick(...boxes.map(box => box[name][c])));
        const min = corner("min", Math.min);
        const max = corner("max", Math.max);
        const center = min.map((value, c) => Number.isFinite(value) ? (value + max[c]) / 2 : 0);
        const half = min.map((value, c) => Number.isFinite(value) ? (max[c] - value) / 2 : 0);
        const radius = Math.hypot(...half);
        return { center, half, radius: radius > 0 ? radius : 1 };
    }

    // One frame for boxes that lie in the same place; otherwise one for each.
    // \param isOneModel  as before and after an operation
    function framesOf(boxes, isOneModel) {
        const common = frameOf(boxes);
        const isAlike = box => frameOf([box]).radius > 0.4 * common.radius;
        return isOneModel || boxes.every(isAlike) ? boxes.map(() => common) : boxes.map(box => frameOf([box]));
    }

    return { Camera, framesOf };
})();
